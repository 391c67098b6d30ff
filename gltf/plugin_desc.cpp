#include "gltf/plugin_desc.h"

#include "gltf/exporter.h"

#include "scene_schema.h"

#include <new>

namespace gltf {

using base::string;
using base::u32;

namespace {

/// The names are those by which hosts know the exporter; nothing is imported.
class PlyPluginDesc final : public scene::IScenePluginDesc {
public:
    PlyPluginDesc() {
        type = base::nameServer().id("GLTFImporter");
        author = "Scene export team";
    }

    base::IPlugin* create(base::PluginFactory& factory, u32 id) override {
        return new (std::nothrow) GLTFScenePlugin(base::ref<base::IPluginDesc>(this), &factory, id);
    }
    /// glTF is written, never read.
    const string& importExtensions() const override {
        static const string none;
        return none;
    }
    const string& exportExtensions() const override {
        static const string list = "gltf;glb";
        return list;
    }
};

} // namespace

void registerPlugin(base::PluginFactory& factory) {
    scene::register_scene_schema(factory);
    scene::register_viewport_schema(factory);
    scene::register_importer_schema();
    scene::register_exporter_schema();
    factory.registerDesc(base::ref<base::IPluginDesc>(new (std::nothrow) PlyPluginDesc));
}

} // namespace gltf
