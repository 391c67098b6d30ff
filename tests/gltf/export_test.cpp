#include "export_fixture.h"

#include "scene_mesh.h"

#include <algorithm>
#include <cmath>
#include <gmock/gmock.h>
#include <set>
#include <sys/wait.h>
#include <unistd.h>

using namespace test_support;
using scene::IMesh;
using scene::mesh_schema;
using scene::meshPrimitive_schema;
using Settings = Exporting::Settings;
using testing::HasSubstr;

namespace {

/// A scene with something for every setting to act on.
void fill(Exporting& scene) {
    scene.set(Settings::n_exportCompress, true);
    IMesh& mesh = makeGrid(scene.addTo<IMesh>(*scene.root, "mesh"), 3);
    appendColors(mesh).resize(16, base::vec3f{1, 0.5f, 0});
    write(mesh, mesh_schema::n_tangents).resize(16, base::vec4f{1, 0, 0, 1});
    auto& edges = scene.addTo<scene::ILines>(*scene.root, "edges");
    edges.attribute<scene::Object>(scene::lines_schema::n_assignment) = scene::Object(&mesh);
    auto& lines = scene.addTo<scene::ILines>(*scene.root, "lines");
    for (auto* each : {&edges, &lines})
        write(*each, scene::lines_schema::n_points) = {{0, 0, 0}, {1, 1, 1}};
    auto& points = scene.addTo<scene::IPoints>(*scene.root, "points");
    write(points, scene::points_schema::n_points) = {{0, 0, 0}};
    scene.addTo<scene::ICamera>(*scene.root, "camera");
    scene.addTo<scene::ILight>(*scene.root, "light");
}

using Features = std::set<std::string>;
struct Exported {
    Features features; ///< what a setting may change
    std::string text;
};

template <class T>
Exported exportWith(base::name_id setting, const T& value) {
    Exporting scene;
    fill(scene);
    scene.set(setting, value);
    const GltfFile file = scene.saveAndRead("a.gltf");
    Features features;
    for (size_t i = 0; i < file.count("meshes"); ++i) {
        features.insert(file.element("meshes", i)["name"].GetString());
        const Primitive primitive = file.primitive(i, 0);
        for (const auto& [name, values] : primitive.attributes)
            features.insert(name);
        if (primitive.compressed)
            features.insert("Draco");
    }
    if (file.json()["asset"].HasMember("copyright"))
        features.insert(file.json()["asset"]["copyright"].GetString());
    if (std::filesystem::exists(scene.folder / "a0.bin"))
        features.insert("side file");
    return {features, readText(scene.folder / "a.gltf")};
}

} // namespace

TEST(Settings, HaveTheEffectsThatTheyName) {
    const Exporting registersNames;
    const std::pair<base::name_id, Features> rows[] = {
        {Settings::n_exportEdges, {"edges"}},
        {Settings::n_exportHair, {"lines"}},
        {Settings::n_exportPoints, {}},
        {Settings::n_exportColors, {"COLOR_0"}},
        {Settings::n_exportTextureCoordinates, {"TEXCOORD_0"}},
        {Settings::n_exportTangents, {}},
        {Settings::n_exportAnimations, {}},
        {Settings::n_exportCameras, {}},
        {Settings::n_exportLights, {}},
        {Settings::n_exportBinary, {}},
        {Settings::n_exportCompress, {"Draco"}},
        {Settings::n_exportCompressImages, {}},
        {Settings::n_exportEmbedded, {"side file"}}};
    const Exported standard = exportWith(Settings::n_exportCompress, true);
    EXPECT_EQ(standard.features, (Features{"mesh", "lines", "POSITION", "NORMAL", "TANGENT",
                                           "TEXCOORD_0", "COLOR_0", "Draco"}));
    for (const auto& [name, changes] : rows) {
        SCOPED_TRACE(name.text());
        const Exported changed = exportWith(name, name == Settings::n_exportEdges);
        Features difference;
        std::ranges::set_symmetric_difference(standard.features, changed.features,
                                              std::inserter(difference, difference.end()));
        EXPECT_EQ(difference, changes);
        EXPECT_EQ(changed.text == standard.text, changes.empty());
    }
    EXPECT_TRUE(
        exportWith(Settings::n_exportCopyright, base::string("(c)")).features.contains("(c)"));
    EXPECT_EQ(exportWith(Settings::n_exportImageMaxDim, 1u).text, standard.text);
}

TEST(Settings, OfTheWrongTypeEndTheExport) {
    Exporting scene;
    fill(scene);
    scene.set<base::i32>(Settings::n_exportEdges, 1);
    EXPECT_THROW(scene.save(scene.folder / "a.glb"), base::exception);
    // Nothing is left behind that would trouble the next one.
    scene.settings.removeAttribute(Settings::n_exportEdges);
    EXPECT_TRUE(scene.save(scene.folder / "a.glb"));
}

TEST(Plugin, WorksAsALoadedModule) {
    Exporting linked;
    // A factory that knows nothing of the exporter but what the module registers.
    SceneBuilder loaded;
    loaded.factory->loadFrom(PLUGIN_FOLDER);
    for (SceneBuilder* scene : {static_cast<SceneBuilder*>(&linked), &loaded})
        makeGrid(scene->addTo<IMesh>(scene->addTo<scene::INode>(*scene->root), "m"), 4);
    const std::string a = linked.folder / "a.glb", b = linked.folder / "b.glb";
    ASSERT_TRUE(linked.save(a));
    ASSERT_TRUE(loaded.factory->save(*loaded.factory, b, linked.settings));
    EXPECT_EQ(readText(a), readText(b));
}

TEST(Scene, MissingOrWithoutRootIsNothingToWrite) {
    const LogCapture log;
    for (int fault = 0; fault < 3; ++fault) {
        SCOPED_TRACE(fault);
        Exporting scene;
        if (fault == 0)
            scene.factory->remove(scene.scene->id(), false);
        else
            write(*scene.scene, scene::scene_schema::n_root) =
                scene::Object(fault == 1 ? nullptr : &scene.add<IMesh>());
        EXPECT_FALSE(scene.save(scene.folder / "a.glb"));
        EXPECT_FALSE(std::filesystem::exists(scene.folder / "a.glb"));
    }
    EXPECT_EQ(problems(log), "");
}

TEST(Scene, GivesTheSameBytesAgain) {
    using scene::buffer_schema, scene::bufferAdapter_schema;
    Exporting scene;
    fill(scene);
    // A mesh that the first export changes, with positions that an adapter has yet to make.
    const float corners[] = {0, 0, 0, 1, 0, 0, 1, 1, 0, 0, 1, 0};
    const auto* bytes = reinterpret_cast<const base::u8*>(corners);
    auto& buffer = scene.add<scene::IBuffer>();
    write(buffer, buffer_schema::n_data) = {bytes, bytes + sizeof corners};
    auto& adapter = scene.add<scene::IBufferAdapter>();
    write(adapter, bufferAdapter_schema::n_inputBuffer) = scene::Object(&buffer);
    const base::name_id output = bufferAdapter_schema::n_outputFloat3;
    adapter.vecAttribute<base::vec3f>(output);
    IMesh& mesh = scene.addTo<IMesh>(*scene.root, "polygons");
    mesh.attribute(mesh_schema::n_positions,
                   new base::AttribLink(base::AttribPath(adapter, output)));
    write(mesh, mesh_schema::n_positionIndices) = {0, 1, 2, 3};
    write(mesh, mesh_schema::n_normalIndices) = {0, 0, 0, 0};
    write(mesh, mesh_schema::n_normals) = {{0, 0, 1}};
    appendPrimitive(mesh, 4);

    const GltfFile file = scene.saveAndRead("a.glb");
    ASSERT_TRUE(scene.save(scene.folder / "b.glb"));
    EXPECT_EQ(readText(scene.folder / "a.glb"), readText(scene.folder / "b.glb"));
    size_t triangles = 0;
    for (size_t i = 0; i < file.count("meshes"); ++i)
        triangles += file.primitive(i, 0).triangles().size();
    EXPECT_EQ(triangles, 18u + 2u);
}

TEST(Scene, GivesTheSameBytesWhateverTheOrderOfNames) {
    if (base::nameServer().find("positions"))
        GTEST_SKIP() << "the names have their order already";
    const struct {
        const char* name;
        bool embedded, compress;
    } forms[] = {{"plain.glb", true, false},     {"compressed.glb", true, true},
                 {"embedded.gltf", true, false}, {"embedded_compressed.gltf", true, true},
                 {"files.gltf", false, false},   {"files_compressed.gltf", false, true}};
    const TempFolder forwards, backwards;
    for (const TempFolder* folder : {&forwards, &backwards}) {
        const pid_t child = ::fork();
        if (child == 0) {
            std::vector<const char*> names;
            for (const auto& list : {mesh_schema::names(), meshPrimitive_schema::names(),
                                     scene::node_schema::names(), scene::scene_schema::names()})
                for (const scene::SchemaName* name : list)
                    names.push_back(name->text);
            if (folder == &backwards)
                std::ranges::reverse(names);
            for (const char* name : names)
                base::nameServer().id(name);
            bool saved = true;
            for (const auto& form : forms) {
                auto scene = std::make_unique<Exporting>();
                scene->set(Exporting::Settings::n_exportEmbedded, form.embedded);
                scene->set(Exporting::Settings::n_exportCompress, form.compress);
                fill(*scene);
                saved &= scene->save(*folder / form.name);
            }
            ::_exit(saved ? 0 : 1);
        }
        int status = -1;
        ASSERT_EQ(::waitpid(child, &status, 0), child);
        ASSERT_EQ(status, 0);
    }
    for (const auto& form : forms)
        EXPECT_EQ(readText(forwards / form.name), readText(backwards / form.name)) << form.name;
    for (const char* file : {"files0.bin", "files_compressed0.bin"})
        EXPECT_EQ(readText(forwards / file), readText(backwards / file)) << file;
}

namespace {

/// The triangles of a primitive whose coordinates are whole numbers, each from its least corner
/// on. Compression rounds much finer.
std::multiset<std::vector<std::array<long, 3>>> trianglesOf(const Primitive& primitive) {
    const AccessorValues& positions = primitive.attributes.at("POSITION");
    std::multiset<std::vector<std::array<long, 3>>> triangles;
    for (const auto& corners : primitive.triangles()) {
        std::vector<std::array<long, 3>> points;
        for (const uint32_t corner : corners) {
            const double* p = positions.at(corner);
            points.push_back({std::lround(p[0]), std::lround(p[1]), std::lround(p[2])});
        }
        std::ranges::rotate(points, std::ranges::min_element(points));
        triangles.insert(points);
    }
    return triangles;
}

} // namespace

TEST(Draco, KeepsTheTrianglesOfEveryMesh) {
    Exporting plain, compressed;
    compressed.set(Settings::n_exportCompress, true);
    for (Exporting* scene : {&plain, &compressed}) {
        makeGrid(scene->addTo<IMesh>(*scene->root, "one"), 5);
        // One stream for both primitives.
        IMesh& two = makeGrid(scene->addTo<IMesh>(*scene->root, "two"), 2);
        write(*findListItem(two, mesh_schema::n_primitives, 0),
              meshPrimitive_schema::n_indexCount) = 12;
        appendPrimitive(two, 3, 12, 12);
        IMesh& lines = scene->addTo<IMesh>(*scene->root, "lines");
        write(lines, mesh_schema::n_positions) = {{0, 0, 0}, {1, 0, 0}};
        appendPrimitive(lines, 2);
        // Targets have no place in a stream.
        write(scene->addTo<scene::IMorph>(*scene->root), scene::morph_schema::n_baseMesh) =
            scene::Object(&makeGrid(scene->add<IMesh>("morph base"), 1));
    }
    const GltfFile before = plain.saveAndRead(), after = compressed.saveAndRead();
    ASSERT_EQ(after.count("meshes"), 4u);
    for (size_t m = 0; m < 4; ++m) {
        const std::string name = after.element("meshes", m)["name"].GetString();
        SCOPED_TRACE(name);
        const auto primitiveCount = after.element("meshes", m)["primitives"].Size();
        std::multiset<std::vector<std::array<long, 3>>> expected;
        for (size_t i = 0; i < primitiveCount; ++i)
            expected.merge(trianglesOf(before.primitive(m, i)));
        for (size_t i = 0; i < primitiveCount; ++i) {
            const Primitive primitive = after.primitive(m, i);
            EXPECT_EQ(primitive.compressed, name == "one" || name == "two");
            EXPECT_EQ(trianglesOf(primitive), expected);
            EXPECT_EQ(primitive.attributes.size(), before.primitive(m, i).attributes.size());
        }
    }
}

TEST(HostileScene, MayShareArraysThatAnotherMeshReplaces) {
    Exporting scene;
    IMesh& user = scene.addTo<IMesh>(*scene.root, "user");
    IMesh& owner = makeTriangle(scene.addTo<IMesh>(*scene.root, "owner"));
    // The second mesh gets new arrays while the document has those of the first.
    write(owner, mesh_schema::n_indices) = {0, 1, 2, 2, 1, 0};
    write(owner, mesh_schema::n_normalIndices) = {0, 0, 0, 1, 1, 1};
    write(owner, mesh_schema::n_normals) = {{0, 0, 1}, {0, 0, -1}, {0, 0, 0}};
    appendColors(owner).resize(3, base::vec3f{1, 0, 0});
    for (const base::name_id name : {mesh_schema::n_positions.id, mesh_schema::n_indices.id,
                                     mesh_schema::n_normals.id, mesh_schema::n_colorSets.id})
        user.attribute(name, new base::AttribLink(base::AttribPath(owner, name)));
    appendPrimitive(user, 3);
    const GltfFile file = scene.saveAndRead();
    for (size_t m = 0; m < 2; ++m) {
        const Primitive primitive = file.primitive(m, 0);
        EXPECT_EQ(primitive.attributes.at("POSITION").count,
                  file.element("meshes", m)["name"] == "user" ? 3u : 6u);
        EXPECT_EQ(primitive.attributes.at("POSITION").at(1)[0], 1);
        EXPECT_EQ(primitive.attributes.at("COLOR_0").at(0)[0], 1);
    }
}

namespace {

constexpr float infinity = std::numeric_limits<float>::infinity();
constexpr const char* cantCompress = "2 gltf |mesh| The mesh can't be compressed";

struct HostileRow {
    std::function<void(Exporting&, IMesh&)> spoil; ///< a mesh that is a grid of 2 by 2
    const char* message;
    bool isReadable = true; ///< by the rules of the format, the mesh included
};

const HostileRow hostileRows[] = {
    {[](Exporting&, IMesh& m) { write(m, mesh_schema::n_positions)[4].y = infinity; },
     "3 gltf |mesh| Found values that are not finite in 'positions', 1 of them"},
    {[](Exporting&, IMesh& m) {
         write(m, mesh_schema::n_positions)[0].x = -3e38f;
         write(m, mesh_schema::n_positions)[1].x = 3e38f;
     },
     cantCompress},
    {[](Exporting&, IMesh& m) {
         write(m, mesh_schema::n_indices) = base::vector<base::u32>(24, 1u);
     },
     cantCompress},
    {[](Exporting&, IMesh& m) { write(m, mesh_schema::n_normals).resize(3); },
     "2 gltf |mesh| Wrong number of elements in 'normals'"},
    {[](Exporting&, IMesh& m) { m.removeAttribute(mesh_schema::n_positions); },
     "2 validate |mesh| The vertex positions are missing!", false},
    {[](Exporting&, IMesh& m) { write(m, mesh_schema::n_indices)[7] = 0xffffffff; },
     "2 validate |mesh| Found face index out of range at position 7!", false},
    {[](Exporting&, IMesh& m) {
         m.removeAttribute(mesh_schema::n_normals);
         m.vecAttribute<double>(mesh_schema::n_normals).resize(9);
     },
     "3 map attribute| Detected invalid access to attribute 'normals'"},
    {[](Exporting& s, IMesh& m) {
         const base::AttribPath nowhere(*s.root, base::nameServer().id("nothing"));
         m.attribute(mesh_schema::n_tangents, new base::AttribLink(nowhere));
     },
     "3 map attribute| Detected invalid link attribute! Cannot resolve 'tangents'"},
    {[](Exporting& s, IMesh&) { write(*s.root, scene::node_schema::n_translate).x = 1e300; },
     "3 gltf || The transform"},
    {[](Exporting& s, IMesh& m) {
         write(s.add<scene::IRenderOutput>(), scene::renderOutput_schema::n_edgeColor).y = infinity;
         auto& edges = s.addTo<scene::ILines>(*s.root);
         edges.attribute<scene::Object>(scene::lines_schema::n_assignment) = scene::Object(&m);
         write(edges, scene::lines_schema::n_points).resize(2);
         s.set(Settings::n_exportEdges, true);
     },
     "3 gltf || The color of edges is not finite"},
    {[](Exporting& s, IMesh&) {
         auto& lines = s.addTo<scene::ILines>(*s.root, "lines");
         write(lines, scene::lines_schema::n_points) = {{1, 1, 1}, {1, infinity, 1}};
     },
     "3 gltf |lines| Found values that are not finite in 'points', 1 of them"},
    {[](Exporting&, IMesh& m) {
         findListItem(m, mesh_schema::n_primitives, 0)
             ->removeAttribute(meshPrimitive_schema::n_vcounts);
     },
     "3 gltf |mesh| Primitive 0 is of no kind that can be drawn!", false}};

} // namespace

TEST(HostileScene, EndsInAMessageAndAFileThatCanBeRead) {
    for (const HostileRow& row : hostileRows) {
        for (const bool compress : {false, true}) {
            SCOPED_TRACE(std::string(row.message) + (compress ? ", compressed" : ""));
            Exporting scene;
            scene.set(Settings::n_exportCompress, compress);
            row.spoil(scene, makeGrid(scene.addTo<IMesh>(*scene.root, "mesh"), 2));
            const LogCapture log;
            const GltfFile file = scene.saveAndRead();
            if (compress || row.message != cantCompress)
                EXPECT_THAT(problems(log), HasSubstr(row.message));
            else
                EXPECT_EQ(problems(log), "");
            if (!row.isReadable)
                continue;
            EXPECT_NO_THROW(file.primitive(file.count("meshes") - 1, 0));
            for (const Fault& fault : findFaults(file))
                ADD_FAILURE() << fault.text;
        }
    }
}
