#include "export_fixture.h"

#include "gltf/exporter.h"
#include "scene_mesh.h"
#include "scene_mesh_index.h"

#include <gmock/gmock.h>

using namespace test_support;
using scene::IMesh;
using scene::lines_schema;
using scene::mesh_schema;
using scene::meshPrimitive_schema;
using Values = std::vector<double>;
using Numbers = base::vector<base::u32>;

namespace {

constexpr float notANumber = std::numeric_limits<float>::quiet_NaN();

/// A scene with one mesh below the root.
struct MeshScene : Exporting {
    IMesh& mesh = addTo<IMesh>(*root, "m");
    Primitive readPrimitive() { return saveAndRead().primitive(0, 0); }
};

/// Makes the positions (0, 0, 0), (1, 1, 0), (2, 0, 0), (3, 1, 0)...
void setPositions(IMesh& mesh, base::u32 count) {
    auto& positions = write(mesh, mesh_schema::n_positions);
    positions.clear();
    for (base::u32 i = 0; i < count; ++i)
        positions.push_back({static_cast<float>(i), static_cast<float>(i % 2), 0});
}

/// Mode and indices of each primitive of the only mesh: "4: 0 1 2".
std::vector<std::string> rangesOf(const GltfFile& file) {
    std::vector<std::string> ranges;
    if (file.count("meshes") == 0)
        return ranges;
    for (size_t i = 0; i < file.element("meshes", 0)["primitives"].Size(); ++i) {
        const Primitive primitive = file.primitive(0, i);
        std::string& text = ranges.emplace_back(std::to_string(primitive.mode) + ":");
        for (const uint32_t index : primitive.indices)
            text.append(" ").append(std::to_string(index));
    }
    return ranges;
}

} // namespace

TEST(Primitives, CoverTheRangesOfTheScene) {
    struct Part {
        base::u16 corners;
        base::i64 start = -1;
        base::u32 count = 0;
        base::u16 topology = 0;
    };
    struct Row {
        const char* name;
        Numbers indices, triIndices;
        std::vector<Part> parts;
        std::vector<std::string> expected;
        const char* message = "";
    } const rows[] = {
        {"no indices, one primitive", {}, {}, {{3}}, {"4: 0 1 2 3 4 5"}},
        {"no indices, two primitives", {}, {}, {{3, 0, 3}, {3, 3, 3}}, {"4: 0 1 2", "4: 3 4 5"}},
        {"no indices, a part of the vertices", {}, {}, {{3, 3, 3}}, {"4: 3 4 5"}},
        {"points and lines beside a quad, which is cut along its shorter diagonal",
         {4, 4, 5, 0, 2, 3, 1},
         {},
         {{1, 0, 1}, {2, 1, 2}, {4, 3, 4}},
         {"0: 4", "1: 4 5", "4: 0 2 1 2 3 1"}},
        {"strips and fans keep their modes",
         {0, 1, 2, 3, 4, 5},
         {},
         {{2, 0, 3, 3}, {3, 0, 4, 4}, {3, 1, 5, 5}},
         {"3: 0 1 2", "5: 0 1 2 3", "6: 1 2 3 4 5"}},
        {"stored triangles of the only primitive",
         {0, 1, 2, 3},
         {0, 1, 2, 0, 2, 3},
         {{4, 0, 4}},
         {"4: 0 1 2 0 2 3"}},
        {"a count beyond the end",
         {0, 1, 2, 3, 4, 5},
         {},
         {{3, 3, 0xffffffff}},
         {"4: 3 4 5"},
         "2 validate |m| Index offset/count out of bounds 3-4294967295 out of 6!\n"},
        {"empty ranges draw nothing",
         {0, 1, 2},
         {},
         {{3, 0, 0}, {3, 0, 3}, {3, 7, 3}},
         {"4: 0 1 2"},
         "2 validate |m| Index offset/count out of bounds 7-3 out of 3!\n"},
        {"nothing is left",
         {0, 1, 2},
         {},
         {{3, 0, 0}},
         {},
         "3 validate |m| Mesh doesn't contain any primitives!\n"}};
    for (const Row& row : rows) {
        SCOPED_TRACE(row.name);
        MeshScene scene;
        setPositions(scene.mesh, 6);
        if (!row.indices.empty())
            write(scene.mesh, mesh_schema::n_indices) = row.indices;
        if (!row.triIndices.empty())
            write(scene.mesh, mesh_schema::n_triIndices) = row.triIndices;
        for (const Part& part : row.parts) {
            auto& made = appendPrimitive(scene.mesh, part.corners, part.start, part.count);
            write(made, meshPrimitive_schema::n_topology) = {part.topology};
            write(scene.mesh, mesh_schema::n_primitives).append(nullptr);
        }
        const LogCapture log;
        const GltfFile file = scene.saveAndRead();
        EXPECT_EQ(rangesOf(file), row.expected);
        EXPECT_EQ(problems(log), row.message);
        EXPECT_TRUE(findFaults(file).empty());
    }
}

TEST(Primitives, OfOneMeshShareTheirVertices) {
    MeshScene scene;
    makeGrid(scene.mesh, 2);
    appendPrimitive(scene.mesh, 3, 12, 12);
    const GltfFile file = scene.saveAndRead();
    const auto& a = file.element("meshes", 0)["primitives"][0];
    const auto& b = file.element("meshes", 0)["primitives"][1];
    EXPECT_EQ(a["attributes"]["POSITION"], b["attributes"]["POSITION"]);
    EXPECT_EQ(a["attributes"]["NORMAL"], b["attributes"]["NORMAL"]);
    EXPECT_NE(a["attributes"]["TEXCOORD_0"], b["attributes"]["TEXCOORD_0"]);
    EXPECT_EQ(file.element("accessors", a["indices"].GetUint())["bufferView"],
              file.element("accessors", b["indices"].GetUint())["bufferView"]);
}

TEST(Attributes, OfSetsAreNumberedAsFarAsTheyAreExported) {
    MeshScene scene;
    IMesh& mesh = makeTriangle(scene.mesh);
    using scene::meshColorSet_schema, scene::meshUVSet_schema;
    write(appendItem(mesh, mesh_schema::n_uvSets), meshUVSet_schema::n_UVW).resize(3);
    appendUVs(mesh) = {{0, 0}, {1, 0.25f}, {0, 2}};
    appendUVs(mesh) = {{0, 0}};
    appendUVs(mesh) = {{7, 1}, {notANumber, 1}, {7, notANumber}};
    write(appendItem(mesh, mesh_schema::n_colorSets), meshColorSet_schema::n_A).resize(3);
    appendColors(mesh) = {{0.5f, 0, 0}, {0, 1, 0}, {0, 0, 0.25f}};
    const LogCapture log;
    const Primitive primitive = scene.readPrimitive();
    EXPECT_EQ(primitive.attributes.size(), 4u);
    EXPECT_EQ(primitive.attributes.at("TEXCOORD_0").values, (Values{0, 1, 1, 0.75, 0, -1}));
    EXPECT_EQ(primitive.attributes.at("TEXCOORD_1").values, (Values{7, 0, 0, 0, 7, 1}));
    EXPECT_EQ(primitive.attributes.at("COLOR_0").values, (Values{0.5, 0, 0, 0, 1, 0, 0, 0, 0.25}));
    EXPECT_EQ(problems(log),
              "2 Non-afine texture coordinates are currently not supported!\n"
              "2 gltf |m| Wrong number of elements in 'UV', the data is left out! Expected 3 "
              "elements, found 1.\n"
              "3 gltf |m| Found values that are not finite in 'UV', 2 of them are set to 0!\n"
              "3 gltf |m| Colors with an alpha component are not supported!\n");
}

TEST(Attributes, TangentsCarryTheSideOfTheBitangent) {
    struct {
        const char* name;
        std::array<float, 3> w, bitangents; ///< of tangents; y of bitangents, none if all are 0
        Numbers indices;
        Values sides;
    } const rows[] = {{"tangents alone", {1, -2, 0}, {}, {}, {1, -1, 1}},
                      {"bitangents decide", {1, 1, -1}, {1, -1, 1}, {}, {1, -1, 1}},
                      {"vertex without index", {1, 1, 1}, {-1, -1, -1}, {0, 1, 0, 9}, {-1, -1, 1}}};
    for (const auto& row : rows) {
        SCOPED_TRACE(row.name);
        MeshScene scene;
        write(makeTriangle(scene.mesh), mesh_schema::n_normals).resize(3, base::normal{0, 0, 1});
        for (size_t v = 0; v < 3; ++v) {
            write(scene.mesh, mesh_schema::n_tangents).push_back({1, 0, 0, row.w[v]});
            if (row.bitangents[v] != 0)
                write(scene.mesh, mesh_schema::n_bitangents).push_back({0, row.bitangents[v], 0});
        }
        if (!row.indices.empty()) {
            write(scene.mesh, mesh_schema::n_indices) = row.indices;
            write(*findListItem(scene.mesh, mesh_schema::n_primitives, 0),
                  meshPrimitive_schema::n_indexCount) = 3;
        }
        const AccessorValues tangents = scene.readPrimitive().attributes.at("TANGENT");
        for (size_t v = 0; v < 3; ++v)
            EXPECT_EQ(Values(tangents.at(v), tangents.at(v) + 4), (Values{1, 0, 0, row.sides[v]}));
    }
}

TEST(Attributes, BoundsAreThoseOfTheObjectOrElseOfItsVertices) {
    const base::box3f stale{{-1, -2, -3}, {4, 5, 6}}, broken{{0, notANumber, 0}, {1, 1, 1}};
    struct {
        const base::box3f* stored;
        float x; ///< of the first vertex; the others lie at x = 3 and 2
        double min, max;
    } const rows[] = {
        {nullptr, 1, 1, 3}, {&stale, 1, -1, 4}, {&broken, 1, 1, 3}, {nullptr, notANumber, 0, 3}};
    for (const auto& row : rows) {
        SCOPED_TRACE(row.min);
        MeshScene scene;
        write(makeTriangle(scene.mesh),
              mesh_schema::n_positions) = {{row.x, 0, 0}, {3, 2, 0}, {2, 3, 0}};
        if (row.stored)
            write(scene.mesh, scene::geometry_schema::n_bounds) = *row.stored;
        const GltfFile file = scene.saveAndRead();
        EXPECT_EQ(file.element("accessors", 0)["min"][0].GetDouble(), row.min);
        EXPECT_EQ(file.element("accessors", 0)["max"][0].GetDouble(), row.max);
    }
}

/// A triangle whose vertices have weights for joints.
struct JointScene : MeshScene {
    JointScene(base::vector<base::u16> counts, Numbers joints, base::vector<float> weights) {
        using scene::meshJointsSet_schema;
        base::AttribMap& set = appendItem(makeTriangle(mesh), mesh_schema::n_jointsSets);
        write(set, meshJointsSet_schema::n_jointCounts) = counts;
        write(set, meshJointsSet_schema::n_weights) = weights;
        if (!joints.empty())
            write(set, meshJointsSet_schema::n_indices) = joints;
    }
};

TEST(Joints, FillFourSlotsAVertex) {
    JointScene scene({6, 0, 2}, {1, 2, 3, 4, 5, 6, 7, 70000}, {1, 1, 1, 1, 3, 3, 0.5f, 0.25f});
    const LogCapture log;
    Primitive primitive = scene.readPrimitive();
    EXPECT_EQ(primitive.attributes["JOINTS_0"].values,
              (Values{1, 2, 3, 4, 0, 0, 0, 0, 7, 0, 7, 7}));
    EXPECT_EQ(primitive.attributes["WEIGHTS_0"].values,
              (Values{0.25, 0.25, 0.25, 0.25, 0, 0, 0, 0, 0.5, 0, 0, 0}));
    EXPECT_EQ(problems(log), "2 gltf |m| Found 1 joint indices above 65535, they are left out!\n");
}

TEST(Joints, ThatDoNotFitAreLeftOut) {
    struct {
        base::vector<base::u16> counts;
        Numbers joints;
        base::vector<float> weights;
        std::string message;
    } const rows[] = {
        {{1, 1},
         {0, 0},
         {1, 1},
         "Wrong joint counts in vertex weights at index 0! Expected 3 elements, found 2."},
        {{1, 1, 1}, {}, {1, 1, 1}, "Missing joint indices in vertex weights at index 0!"},
        {{1, 1, 9}, {0, 0, 0}, {1, 1, 1}, "Missing joint indices in vertex weights at index 0!"},
        {{1, 1, 1}, {0, 0, 0}, {1, 1}, "Missing weights in joint weights at index 0!"}};
    for (const auto& row : rows) {
        SCOPED_TRACE(row.message);
        JointScene scene(row.counts, row.joints, row.weights);
        const LogCapture log;
        EXPECT_EQ(scene.readPrimitive().attributes.size(), 1u);
        EXPECT_EQ(problems(log), "2 m| " + row.message + "\n");
    }
}

TEST(Vertices, WithSeparateIndicesBecomeOnePerCorner) {
    // Equal values are one vertex, unless a morph may move their positions apart.
    for (const bool isMorphBase : {false, true}) {
        MeshScene scene;
        write(makeTriangle(scene.mesh), mesh_schema::n_positions).push_back({0, 0, 0});
        write(scene.mesh, mesh_schema::n_positionIndices) = {0, 1, 2, 3, 1, 2};
        appendUVs(scene.mesh).resize(4);
        if (isMorphBase)
            write(scene.add<scene::IMorph>(), scene::morph_schema::n_baseMesh) =
                scene::Object(&scene.mesh);
        EXPECT_EQ(rangesOf(scene.saveAndRead())[0],
                  isMorphBase ? "4: 0 1 2 3 1 2" : "4: 0 1 2 0 1 2");
    }
}

namespace {

/// A mesh that is converted by hand, and one morph target.
struct TargetScene : MeshScene {
    IMesh& target = add<IMesh>("target");
    base::ref<GLTF::Mesh> gltfMesh;

    bool convert(bool isWholeShape) {
        const auto exporter = base::makeRef<gltf::GLTFScenePlugin>(nullptr, nullptr, 0);
        gltfMesh = exporter->convertMesh(mesh, 0, false);
        return exporter->convertMorphTarget(*gltfMesh, target, mesh, isWholeShape);
    }
    GLTF::Accessor* find(const char* name) {
        const auto& targets = std::as_const(gltfMesh->primitives[0]->targets);
        const auto* accessor = targets.empty() ? nullptr : targets[0]->attributes.get(name);
        return accessor ? accessor->get() : nullptr;
    }
    Values values(const char* name) {
        const GLTF::Accessor* accessor = find(name);
        Values all;
        for (int i = 0; accessor && i < accessor->count; ++i) {
            float element[4];
            accessor->getComponentsAtIndex(i, element);
            all.insert(all.end(), element, element + accessor->getNumberOfComponents());
        }
        return all;
    }
};

} // namespace

TEST(MorphTargets, HoldDifferencesWhateverTheSceneStores) {
    for (const bool isWholeShape : {false, true}) {
        SCOPED_TRACE(isWholeShape);
        TargetScene scene;
        for (IMesh* mesh : {&makeTriangle(scene.mesh), &scene.target}) {
            write(*mesh, mesh_schema::n_normals).resize(3, base::normal{0, 0, 1});
            write(*mesh, mesh_schema::n_tangents).resize(3, base::vec4f{1, 0, 0, 1});
        }
        write(scene.target, mesh_schema::n_positions) = {{0, 0, 5}, {3, 0, 0}, {0, 1, notANumber}};
        write(scene.target, mesh_schema::n_tangents)[1] = {0, 0, 1, 1};
        ASSERT_TRUE(scene.convert(isWholeShape));
        EXPECT_EQ(scene.values("POSITION"), isWholeShape ? (Values{0, 0, 5, 2, 0, 0, 0, 0, 0})
                                                         : (Values{0, 0, 5, 3, 0, 0, 0, 1, 0}));
        EXPECT_EQ(scene.values("NORMAL")[2], isWholeShape ? 0 : 1);
        EXPECT_EQ(scene.values("TANGENT"), isWholeShape ? (Values{0, 0, 0, -1, 0, 1, 0, 0, 0})
                                                        : (Values{1, 0, 0, 0, 0, 1, 1, 0, 0}));
        EXPECT_EQ(scene.find("POSITION")->max[0], isWholeShape ? 2 : 3);
        EXPECT_TRUE(scene.find("NORMAL")->bufferView->buffer->ownsData);
    }
}

TEST(MorphTargets, FollowTheVerticesOfTheirBase) {
    // The corners of two triangles, which share no vertex because of their normals.
    const Numbers faces{0, 1, 2, 2, 1, 3}, reversed{5, 4, 3, 3, 4, 2};
    struct {
        const char* name;
        const Numbers *positionIndices, *indices;
        base::u32 positionCount;
        Values x; ///< of the vertices: the index of the position
    } const rows[] = {{"by the position", nullptr, nullptr, 4, {0, 1, 2, 2, 1, 3}},
                      {"by indices of its own", &reversed, nullptr, 6, {5, 4, 3, 3, 4, 2}},
                      {"by shared indices", nullptr, &reversed, 6, {5, 4, 3, 3, 4, 2}},
                      {"too few positions", nullptr, nullptr, 3, {}},
                      {"too few positions for its indices", &reversed, nullptr, 4, {}}};
    for (const auto& row : rows) {
        SCOPED_TRACE(row.name);
        TargetScene scene;
        setPositions(scene.mesh, 4);
        write(scene.mesh, mesh_schema::n_positionIndices) = faces;
        write(scene.mesh, mesh_schema::n_normals) = {{0, 0, 1}, {0, 0, -1}};
        write(scene.mesh, mesh_schema::n_normalIndices) = {0, 0, 0, 1, 1, 1};
        appendPrimitive(scene.mesh, 3);
        setPositions(scene.target, row.positionCount);
        if (row.positionIndices)
            write(scene.target, mesh_schema::n_positionIndices) = *row.positionIndices;
        if (row.indices)
            write(scene.target, mesh_schema::n_indices) = *row.indices;
        ASSERT_TRUE(convertToSingleIndex(scene.mesh, true));
        const LogCapture log;
        EXPECT_EQ(scene.convert(false), !row.x.empty());
        const Values values = scene.values("POSITION");
        ASSERT_EQ(values.size(), 3 * row.x.size());
        for (size_t v = 0; v < row.x.size(); ++v)
            EXPECT_EQ(values[3 * v], row.x[v]);
        EXPECT_EQ(problems(log).empty(), !row.x.empty());
    }
}

TEST(MorphTargets, ThatDoNotFitLeaveNoTrace) {
    TargetScene scene;
    makeTriangle(scene.mesh);
    const LogCapture log;
    EXPECT_FALSE(scene.convert(false)) << "no positions";
    setPositions(scene.target, 4);
    EXPECT_FALSE(scene.convert(false));
    EXPECT_TRUE(scene.gltfMesh->primitives[0]->draco());
    EXPECT_EQ(problems(log), "2 gltf |target| Wrong number of elements in 'positions', the data is "
                             "left out! Expected 3 elements, found 4.\n");
    setPositions(scene.target, 3);
    write(scene.target, mesh_schema::n_normals).resize(3);
    EXPECT_TRUE(scene.convert(false));
    EXPECT_FALSE(scene.find("NORMAL")) << "the base has none";
    EXPECT_FALSE(scene.gltfMesh->primitives[0]->draco());
}

TEST(Lines, AreCutIntoSegments) {
    struct {
        const char* name;
        base::u32 pointCount;
        Numbers starts, indices;
        Values expected; ///< x of both ends of each segment
        int faulty = 0;  ///< segments without a second point
    } const rows[] = {
        {"one line", 4, {}, {}, {0, 1, 1, 2, 2, 3}},
        {"two lines", 5, {0, 3}, {}, {0, 1, 1, 2, 3, 4}},
        {"a line of one point has a segment", 4, {0, 1}, {}, {0, 1, 1, 2, 2, 3}},
        {"starts of segments", 4, {0, 2}, {2, 0}, {2, 3, 0, 1}},
        {"out of order, out of range", 3, {1, 0, 4000000000}, {}, {1, 2, 0, 1, 1, 2}, 1},
        {"no second point", 3, {}, {2, 1, 0xffffffff}, {1, 2}, 2},
        {"nothing to draw", 1, {}, {}, {}}};
    for (const auto& row : rows) {
        SCOPED_TRACE(row.name);
        Exporting scene;
        auto& lines = scene.addTo<scene::ILines>(*scene.root, "l");
        for (base::u32 i = 0; i < row.pointCount; ++i)
            write(lines, lines_schema::n_points).push_back({static_cast<float>(i), 2, 0});
        if (!row.starts.empty())
            write(lines, lines_schema::n_linesStart) = row.starts;
        if (!row.indices.empty())
            write(lines, mesh_schema::n_indices) = row.indices;
        const LogCapture log;
        const GltfFile file = scene.saveAndRead();
        const char* message = "";
        if (row.expected.empty())
            message = "3 gltf |l| The lines have no segments, they are left out!\n";
        else if (row.faulty > 0)
            message =
                "3 gltf |l| Found {} line segments without a second point, they are left out!\n";
        EXPECT_EQ(problems(log), base::format(message, row.faulty));
        Values x;
        for (size_t i = 0; i < row.expected.size(); ++i)
            x.push_back(file.primitive(0, 0).attributes.at("POSITION").at(i)[0]);
        EXPECT_EQ(x, row.expected);
        EXPECT_EQ(file.count("meshes"), row.expected.empty() ? 0u : 1u);
    }
}

TEST(Lines, OfMeshEdgesStandOffAndShareOneMaterial) {
    Exporting scene;
    scene.set(Exporting::Settings::n_exportEdges, true);
    scene.set(Exporting::Settings::n_exportHair, false);
    write(scene.add<scene::IRenderOutput>(), scene::renderOutput_schema::n_edgeColor) = {0.5f, 0,
                                                                                         1};
    auto& byObject = scene.addTo<scene::ILines>(*scene.root, "a");
    byObject.attribute<scene::Object>(lines_schema::n_assignment) = scene::Object(scene.root);
    auto& byFaces = scene.addTo<scene::ILines>(*scene.root, "b");
    write(byFaces, lines_schema::n_assignment) = {0};
    auto& free = scene.addTo<scene::ILines>(*scene.root, "free");
    free.attribute<scene::Object>(lines_schema::n_assignment); // null
    for (auto* lines : {&byObject, &byFaces, &free})
        write(*lines, lines_schema::n_points) = {{0, 0, 0}, {1, 0, 0}};
    const LogCapture log;
    const GltfFile file = scene.saveAndRead();
    EXPECT_EQ(problems(log), "");
    ASSERT_EQ(file.count("meshes"), 2u);
    ASSERT_EQ(file.count("materials"), 1u);
    const auto& color = file.element("materials", 0)["pbrMetallicRoughness"]["baseColorFactor"];
    const double expected[] = {0.5, 0, 1, 1};
    for (rapidjson::SizeType c = 0; c < 4; ++c)
        EXPECT_EQ(color[c].GetDouble(), expected[c]);
    for (size_t i = 0; i < 2; ++i) {
        EXPECT_EQ(file.primitive(i, 0).material, 0);
        EXPECT_NEAR(file.primitive(i, 0).attributes.at("POSITION").at(1)[0], 1.0001, 1e-7);
    }
    // The bounds are those of the object, not scaled.
    EXPECT_EQ(file.element("accessors", 0)["max"][0].GetDouble(), 1);
}

TEST(Lines, TooManyEndTheExportBeforeAnyFile) {
    Exporting scene;
    auto& lines = scene.addTo<scene::ILines>(*scene.root, "many");
    write(lines, lines_schema::n_points).resize(1000000);
    auto& starts = write(lines, lines_schema::n_linesStart);
    starts.resize(1000000, 0u);
    for (base::u32 i = 1; i < 1000000; i += 2)
        starts[i] = 999999;
    EXPECT_THROW(scene.save(scene.folder / "a.glb"), base::exception);
    EXPECT_FALSE(std::filesystem::exists(scene.folder / "a.glb"));
}
