#pragma once

#include "log_capture.h"
#include "scene.h"
#include "scene_attribute.h"
#include "scene_factory.h"

#include "assimp/importer.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>

namespace test_support {

/// Imports model files that are given as text.
class Import : public testing::Test {
protected:
    Import() {
        std::string pattern = (std::filesystem::temp_directory_path() / "assimpXXXXXX").string();
        folder_ = mkdtemp(pattern.data());
        assimp::registerPlugin(importers_);
        scene::fillImporterDefaults(settings_);
    }
    ~Import() override { std::filesystem::remove_all(folder_); }

    base::string write(const std::string& name, const std::string& text) {
        const std::filesystem::path path = folder_ / name;
        std::ofstream(path, std::ios::binary) << text;
        return path.string();
    }

    template <class T>
    void set(base::name_id setting, T value) {
        settings_.attribute<T>(setting) = value;
    }
    template <class T>
    requires std::is_enum_v<T>
    void set(base::name_id setting, T value) {
        set(setting, static_cast<scene::Enumeration>(value));
    }

    /// Imports the file into a new document.
    bool loadPath(const base::string& path) {
        document_ = std::make_unique<scene::SceneFactory>();
        scene::register_scene_schema(*document_);
        return importers_.load(*document_, path, settings_);
    }
    bool load(const std::string& name, const std::string& text) {
        return loadPath(write(name, text));
    }

    base::vector<base::IPlugin*> objects(base::name_id type) const {
        base::vector<base::IPlugin*> found;
        for (const auto& object : document_->plugins())
            if (object && object->typeName() == type)
                found.push_back(object.get());
        return found;
    }
    /// The only object of its type; an empty one of no type, and a failure, if there is none.
    base::IPlugin& only(base::name_id type) {
        const auto found = objects(type);
        EXPECT_EQ(found.size(), 1u) << type.text();
        return found.empty() ? *nothing_ : *found[0];
    }
    base::IPlugin& mesh() { return only(scene::mesh_schema::n_kind); }

    using Settings = scene::sceneImporter_schema;
    base::AttribMap settings_;
    std::filesystem::path folder_;
    scene::SceneFactory importers_;
    std::unique_ptr<scene::SceneFactory> document_;
    base::ref<base::IPlugin> nothing_ = base::makeRef<base::IPlugin>(nullptr, nullptr, 0u);
};

/// The vector of an attribute; empty where there is none.
template <class T>
base::vector<T> valuesOf(const base::AttribMap& map,
                         const scene::SchemaAttribute<base::vector<T>>& attribute) {
    const base::vector<T>* values = find(map, attribute);
    return values ? *values : base::vector<T>();
}

/// The same for each corner: what the indices select, or all values where there are none.
template <class T>
base::vector<T> cornersOf(const base::AttribMap& map,
                          const scene::SchemaAttribute<base::vector<T>>& attribute,
                          const scene::SchemaAttribute<base::vector<base::u32>>& indices) {
    const base::vector<T> values = valuesOf(map, attribute);
    if (!find(map, indices))
        return values;
    base::vector<T> corners;
    for (const base::u32 index : *find(map, indices))
        corners.push_back(values[index]);
    return corners;
}

} // namespace test_support
