// Makes a scene of one triangle and writes it: minimal_host PLUGIN_FOLDER OUTPUT
#include "b_log.h"
#include "scene.h"
#include "scene_factory.h"

int main(int argumentCount, char** arguments) {
    if (argumentCount != 3)
        return 1;
    const base::string plugins = arguments[1], output = arguments[2];
    base::log().addOutput(&base::console());

    // The document: a scene, its root node and, below that, a mesh.
    const auto document = base::makeRef<scene::SceneFactory>();
    const auto scene = document->create(scene::scene_schema::n_kind);
    const auto root = document->create(scene::node_schema::n_kind);
    const auto mesh = document->create(scene::mesh_schema::n_kind);
    write(*scene, scene::scene_schema::n_root) = root;
    write(*root, scene::node_schema::n_children) = {mesh};
    write(*mesh, scene::mesh_schema::n_positions) = {{0, 0, 0}, {1, 0, 0}, {0, 1, 0}};
    write(*mesh, scene::mesh_schema::n_indices) = {0, 1, 2};
    auto* triangles = new base::AttribMap; // a primitive; the list below owns it
    write(*mesh, scene::mesh_schema::n_primitives).append(triangles);
    write(*triangles, scene::meshPrimitive_schema::n_vcounts) = {3}; // corners of each face

    // The exporter's settings: its defaults, then what we want otherwise.
    document->loadPlugins(plugins);
    base::AttribMap settings;
    if (!document->getExporterParameters(output, settings))
        return 3;
    write(settings, scene::sceneExporter_schema::n_exportCompress) = false;

    // A file that can't be written is an error in the log and nothing more.
    const bool saved = document->save(*document, output, settings);
    return saved && !base::log().hasErrors() ? 0 : 4;
}
