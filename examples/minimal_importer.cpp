// An import plugin for files of numbers (.tri), nine for each triangle: x, y, z of its corners.
#include "scene.h"
#include "scene_factory.h"

#include "stream/b_fs.h"

#include <charconv>
#include <numeric>

namespace {

/// The points in the file, as many as form whole triangles.
base::vector<base::vec3f> readCorners(const base::string& path) {
    base::Stream stream;
    base::fs::master().open(stream, path, base::fs::openRead); // throws if it can't
    base::string text(stream.size(), ' ');
    stream.read(text.data(), text.size());

    base::vector<base::vec3f> corners;
    float numbers[3];
    int count = 0;
    const char* const end = text.data() + text.size();
    for (const char* at = text.data(); at != end;) {
        const auto [next, error] = std::from_chars(at, end, numbers[count]);
        at = error == std::errc() ? next : at + 1;
        if (error == std::errc() && ++count == 3) {
            corners.push_back({numbers[0], numbers[1], numbers[2]});
            count = 0;
        }
    }
    corners.resize(corners.size() / 3 * 3);
    return corners;
}

class TriangleImporter final : public scene::SceneImportPlugin {
public:
    using SceneImportPlugin::SceneImportPlugin;

    bool canLoad(const base::string& path) override { return base::fs::master().exists(path); }

    bool load(base::PluginFactory& scene, const base::string& path) override {
        const auto document = scene.create(scene::scene_schema::n_kind);
        const auto root = scene.create(scene::node_schema::n_kind);
        scene::write(*document, scene::scene_schema::n_root) = root;
        // A setting is an attribute of the importer.
        if (!scene::read(*this, scene::sceneImporter_schema::n_importMeshes))
            return true;

        const auto mesh = scene.create(scene::mesh_schema::n_kind);
        scene::write(*root, scene::node_schema::n_children) = {mesh};
        auto& positions = scene::write(*mesh, scene::mesh_schema::n_positions);
        positions = readCorners(path);
        auto& indices = scene::write(*mesh, scene::mesh_schema::n_indices);
        indices.resize(positions.size());
        std::iota(indices.begin(), indices.end(), 0u);
        auto* triangles = new base::AttribMap; // a primitive; the list owns it
        scene::write(*mesh, scene::mesh_schema::n_primitives).append(triangles);
        scene::write(*triangles, scene::meshPrimitive_schema::n_vcounts) = {3};
        return true;
    }
};

class TriangleImporterDesc final : public scene::IScenePluginDesc {
public:
    TriangleImporterDesc() {
        type = base::nameServer().id("TriangleImporter"); // its name in importers.txt
        info = "Reads files of triangles.";
    }
    base::IPlugin* create(base::PluginFactory& factory, base::u32 id) override {
        return new TriangleImporter(this, &factory, id);
    }
    const base::string& importExtensions() const override { return extensions_; }
    const base::string& exportExtensions() const override { return none_; }

private:
    base::string extensions_ = "tri|Triangles", none_;
};

} // namespace

extern "C" __attribute__((visibility("default"))) base::i32
loadScenePlugin(base::PluginFactory& factory) {
    scene::register_scene_schema(factory);
    scene::register_importer_schema();
    factory.registerDesc(base::makeRef<TriangleImporterDesc>());
    return 0;
}

extern "C" __attribute__((visibility("default"))) base::u32 unloadScenePlugin() {
    return 0;
}
