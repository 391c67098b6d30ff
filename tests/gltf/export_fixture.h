#pragma once

#include "support/gltf_faults.h"
#include "support/gltf_reader.h"
#include "support/log_capture.h"
#include "support/scene_builder.h"
#include "support/temp_folder.h"

#include "b_exception.h"
#include "gltf/plugin_desc.h"

#include <filesystem>
#include <fstream>
#include <functional>
#include <gtest/gtest.h>

namespace test_support {

inline std::string readText(const std::string& path) {
    const Bytes bytes = readBytes(path);
    return {bytes.begin(), bytes.end()};
}

/// A scene that is exported the way a host does it, uncompressed unless a test asks for it.
struct Exporting : SceneBuilder {
    using Settings = scene::sceneExporter_schema;

    Exporting() {
        gltf::registerPlugin(*factory);
        set(Settings::n_exportCompress, false);
    }
    template <class T>
    void set(base::name_id setting, const T& value) {
        settings.attribute<T>(setting) = value;
    }
    bool save(const std::string& path) { return factory->save(*factory, path, settings); }
    GltfFile saveAndRead(const std::string& name = "scene.glb") {
        EXPECT_TRUE(save(folder / name));
        return GltfFile::read(folder / name);
    }

    TempFolder folder;
    base::AttribMap settings;
};

} // namespace test_support
