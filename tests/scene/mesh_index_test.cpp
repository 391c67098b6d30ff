#include "scene_mesh_index.h"

#include "mesh_builder.h"

#include "log_capture.h"

#include <cstring>
#include <map>
#include <random>

namespace {

using namespace scene;
using namespace test_support;
using namespace base;

class MeshIndex : public MeshTest {};

string bytesOf(const auto& element) {
    return string(reinterpret_cast<const char*>(&element), sizeof(element));
}

TEST_F(MeshIndex, ConvertedMeshHasNothingElse) {
    // Two triangles with one edge in common and normals of their own.
    write(mesh_, mesh_schema::n_positions) = {{0, 0, 0}, {1, 0, 0}, {0, 1, 0}, {1, 1, 5}};
    write(mesh_, mesh_schema::n_normals) = {{0, 0, -1}, {0, 0, 1}};
    write(mesh_, mesh_schema::n_positionIndices) = {0, 1, 2, 2, 1, 3};
    write(mesh_, mesh_schema::n_normalIndices) = {0, 0, 0, 1, 1, 1};
    AttribMap& primitive = addPrimitive({3});
    write(primitive, meshPrimitive_schema::n_triIndexStart) = 3;
    write(mesh_, mesh_schema::n_triIndices) = {0, 1, 2};
    ASSERT_TRUE(convertToSingleIndex(mesh_));
    EXPECT_EQ(
        listOf(find(mesh_, mesh_schema::n_positions)),
        (std::vector<vec3f>{{0, 0, 0}, {1, 0, 0}, {0, 1, 0}, {0, 1, 0}, {1, 0, 0}, {1, 1, 5}}));
    EXPECT_EQ(listOf(find(mesh_, mesh_schema::n_indices)), (std::vector<u32>{0, 1, 2, 3, 4, 5}));
    // What addressed the former vertices is gone.
    for (const auto* name : {&mesh_schema::n_positionIndices, &mesh_schema::n_normalIndices,
                             &mesh_schema::n_triIndices})
        EXPECT_EQ(find(mesh_, *name), nullptr);
    EXPECT_EQ(find(primitive, meshPrimitive_schema::n_triIndexStart), nullptr);
    // Again: nothing left to do.
    const vec3f* data = std::as_const(*find(mesh_, mesh_schema::n_positions)).data();
    EXPECT_TRUE(convertToSingleIndex(mesh_));
    EXPECT_EQ(find(mesh_, mesh_schema::n_positions)->data(), data);
}

/// A mesh of random channels and what each corner addresses in them.
class RandomMesh {
public:
    RandomMesh(AttribMap& mesh, std::mt19937& random) : mesh_(mesh), random_(random) {}

    u32 number(u32 below) { return u32(random_() % below); }
    /// Few values, so that many are equal; both zeros among them.
    float value() { return std::array{0.0f, -0.0f, 1.0f, 2.5f}[number(4)]; }
    vector<u32> indices(u32 below) {
        vector<u32> result;
        for (u32 c = 0; c < cornerCount; ++c)
            result.push_back(number(below));
        return result;
    }
    template <class T, class Make>
    const vector<T>& fill(AttribMap& owner, base::name_id name, u32 count, Make make) {
        auto& values = owner.vecAttribute<T>(name);
        for (u32 i = 0; i < count; ++i)
            values.push_back(make());
        return values;
    }
    /// Notes a channel: the bytes that each corner addresses, and the tuple of its index.
    template <class T>
    void note(const vector<T>& values, const vector<u32>& index) {
        for (u32 c = 0; c < cornerCount; ++c) {
            values_[c] += bytesOf(values[index[c]]);
            tuples_[c] += bytesOf(index[c]);
        }
    }
    /// Numbers by first appearance of the keys.
    static vector<u32> number(const std::vector<string>& keys) {
        std::map<string, u32> ids;
        vector<u32> result;
        for (const string& key : keys)
            result.push_back(ids.try_emplace(key, u32(ids.size())).first->second);
        return result;
    }

    static constexpr u32 cornerCount = 300;
    AttribMap& mesh_;
    std::mt19937& random_;
    std::vector<string> values_{cornerCount}, tuples_{cornerCount};
};

// Both ways of telling vertices apart, against a slow model that compares whole keys. The cases
// run from one position for all corners to one for each.
TEST_F(MeshIndex, NumbersByFirstAppearance) {
    std::mt19937 random(7);
    for (u32 round = 0; round < 200; ++round) {
        SCOPED_TRACE(round);
        AttribMap mesh;
        RandomMesh r(mesh, random);
        const bool tuples = round % 2 == 0;
        const bool byPosition = round % 4 == 3; // a morph base
        const u32 positionCount = std::array{1u, 5u, 40u, 300u, 1000u}[round % 5];
        const auto point = [&] { return vec3f{r.value(), r.value(), r.value()}; };
        const vector<vec3f> positions =
            r.fill<vec3f>(mesh, mesh_schema::n_positions, positionCount, point);
        const vector<u32> global = r.indices(positionCount);
        write(mesh, tuples ? mesh_schema::n_positionIndices : mesh_schema::n_indices) = global;
        r.note(positions, global);
        if (byPosition)
            for (u32 c = 0; c < r.cornerCount; ++c)
                r.values_[c] += bytesOf(global[c]);

        const u32 normalCount = 1 + r.number(200);
        const vector<normal> normals =
            r.fill<normal>(mesh, mesh_schema::n_normals, normalCount, [&] {
                return normal{r.value(), 0, 1};
            });
        const vector<u32> normalIndices = r.indices(normalCount);
        write(mesh, mesh_schema::n_normalIndices) = normalIndices;
        r.note(normals, normalIndices);
        // UVs with indices of their own, by position, or by corner.
        auto* set = new AttribMap;
        write(mesh, mesh_schema::n_uvSets).append(set);
        const u32 kind = tuples ? 0 : r.number(3);
        vector<u32> uvIndices = kind == 0 ? r.indices(20) : global;
        for (u32 c = 0; kind == 2 && c < r.cornerCount; ++c)
            uvIndices[c] = c;
        const bool byCorner = kind == 2 && positionCount != r.cornerCount;
        const vector<vec2f> uvs = r.fill<vec2f>(*set, meshUVSet_schema::n_UV,
                                                kind == 0  ? 20
                                                : byCorner ? r.cornerCount
                                                           : positionCount,
                                                [&] {
                                                    return vec2f{r.value(), r.value()};
                                                });
        if (kind == 0)
            write(*set, meshUVSet_schema::n_indices) = uvIndices;
        else if (!byCorner)
            uvIndices = global;
        r.note(uvs, uvIndices);

        ASSERT_TRUE(convertToSingleIndex(mesh, byPosition));
        const vector<u32> expected = RandomMesh::number(tuples ? r.tuples_ : r.values_);
        const auto& indices = *find(mesh, mesh_schema::n_indices);
        ASSERT_EQ(listOf(&indices), listOf(&expected));
        for (u32 c = 0; c < r.cornerCount; ++c) {
            const u32 v = indices[c];
            ASSERT_EQ(bytesOf((*find(mesh, mesh_schema::n_positions))[v]),
                      bytesOf(positions[global[c]]));
            ASSERT_EQ(bytesOf((*find(mesh, mesh_schema::n_normals))[v]),
                      bytesOf(normals[normalIndices[c]]));
            ASSERT_EQ(bytesOf((*find(*set, meshUVSet_schema::n_UV))[v]),
                      bytesOf(uvs[uvIndices[c]]));
        }
        const VertexOrigins origins = findVertexOrigins(mesh);
        ASSERT_EQ(origins.corners != nullptr, byPosition);
        for (u32 c = 0; byPosition && c < r.cornerCount; ++c) {
            const u32 first = (*origins.corners)[indices[c]];
            ASSERT_LE(first, c);
            ASSERT_EQ(indices[first], indices[c]);
            ASSERT_EQ((*origins.positions)[indices[c]], global[c]);
        }
    }
}

TEST_F(MeshIndex, FaultyIndices) {
    LogCapture log;
    write(mesh_, mesh_schema::n_positions) = {{0, 0, 0}, {1, 0, 0}, {2, 0, 0}};
    write(mesh_, mesh_schema::n_normals) = {{0, 0, 1}};
    write(mesh_, mesh_schema::n_bitangents) = {{0, 1, 0}};
    write(mesh_, mesh_schema::n_positionIndices) = {2, 1, 3};
    write(mesh_, mesh_schema::n_normalIndices) = {0, 0, 0};
    write(mesh_, mesh_schema::n_tangentIndices) = {0, 0};
    AttribMap& colors = add(mesh_schema::n_colorSets);
    write(colors, meshColorSet_schema::n_A) = {0.5f, 0.25f};
    EXPECT_FALSE(convertToSingleIndex(mesh_));
    EXPECT_TRUE(log.has(2, "box| Unable to convert to single indexed vertex data..."));
    EXPECT_EQ(find(mesh_, mesh_schema::n_bitangents)->size(), 1u);
    EXPECT_EQ(find(mesh_, mesh_schema::n_indices), nullptr);
    log.take();

    // A normal index that leads nowhere costs the normal, one that says so costs no message.
    write(mesh_, mesh_schema::n_positionIndices) = {2, 1, 0};
    write(mesh_, mesh_schema::n_normalIndices) = {0, 7, 0};
    AttribMap& uvs = add(mesh_schema::n_uvSets);
    write(uvs, meshUVSet_schema::n_UV) = {{5, 5}, {6, 6}};
    write(uvs, meshUVSet_schema::n_indices) = {1, 0, 9};
    write(uvs, meshUVSet_schema::n_invalidIndex) = 9;
    EXPECT_TRUE(convertToSingleIndex(mesh_));
    EXPECT_EQ(listOf(find(mesh_, mesh_schema::n_normals)),
              (std::vector<normal>{{0, 0, 1}, {0, 0, 0}, {0, 0, 1}}));
    EXPECT_EQ(listOf(find(uvs, meshUVSet_schema::n_UV)),
              (std::vector<vec2f>{{6, 6}, {5, 5}, {0, 0}}));
    // Arrays that fit neither corners nor positions are dropped.
    EXPECT_EQ(find(mesh_, mesh_schema::n_bitangents), nullptr);
    EXPECT_EQ(find(colors, meshColorSet_schema::n_A), nullptr);
    ASSERT_EQ(log.entries().size(), 3u);
    for (const LogCapture::Entry& entry : log.entries()) {
        EXPECT_EQ(entry.level, 2);
        EXPECT_EQ(entry.text.rfind("gltf |box| ", 0), 0u) << entry.text;
    }
}

template <class Count, class Index>
void checkJoints() {
    AttribMap mesh;
    write(mesh, mesh_schema::n_positions) = {{0, 0, 0}, {1, 0, 0}, {2, 0, 0}};
    write(mesh, mesh_schema::n_velocities) = {{0, 0, 10}, {0, 0, 11}, {0, 0, 12}};
    write(mesh, mesh_schema::n_normals) = {{0, 0, 1}, {0, 1, 0}};
    write(mesh, mesh_schema::n_positionIndices) = {2, 0, 1, 2, 0};
    write(mesh, mesh_schema::n_normalIndices) = {0, 0, 0, 1, 0};
    auto* set = new AttribMap;
    write(mesh, mesh_schema::n_jointsSets).append(set);
    set->vecAttribute<Count>(meshJointsSet_schema::n_jointCounts) = {2, 0, 3};
    set->vecAttribute<Index>(meshJointsSet_schema::n_indices) = {20, 21, 30, 31, 32};
    write(*set, meshJointsSet_schema::n_weights) = {0.5f, 0.25f, 1, 2, 3};
    ASSERT_TRUE(convertToSingleIndex(mesh));
    // Vertices: (2,0), (0,0), (1,0), (2,1).
    EXPECT_EQ(listOf(find(mesh, mesh_schema::n_indices)), (std::vector<u32>{0, 1, 2, 3, 1}));
    EXPECT_EQ(listOf(set->findVecAttribute<Count>(meshJointsSet_schema::n_jointCounts)),
              (std::vector<Count>{3, 2, 0, 3}));
    EXPECT_EQ(listOf(set->findVecAttribute<Index>(meshJointsSet_schema::n_indices)),
              (std::vector<Index>{30, 31, 32, 20, 21, 30, 31, 32}));
    EXPECT_EQ(listOf(find(*set, meshJointsSet_schema::n_weights)),
              (std::vector<float>{1, 2, 3, 0.5f, 0.25f, 1, 2, 3}));
    EXPECT_EQ((*find(mesh, mesh_schema::n_velocities))[3], (vec3f{0, 0, 12}));
}

TEST_F(MeshIndex, JointsAndVelocitiesFollowThePositions) {
    LogCapture log;
    checkJoints<u8, u16>();
    checkJoints<u16, u32>();
    checkJoints<u32, u8>();
    EXPECT_TRUE(log.entries().empty());
}

// Equal data at two positions: with joints they stay two vertices, or one would take the joints
// of the other.
TEST_F(MeshIndex, EqualValuesWithOtherJointsStayApart) {
    write(mesh_, mesh_schema::n_positions) = {{1, 1, 1}, {1, 1, 1}};
    write(mesh_, mesh_schema::n_normals) = {{0, 0, 1}};
    write(mesh_, mesh_schema::n_indices) = {0, 1, 0};
    write(mesh_, mesh_schema::n_normalIndices) = {0, 0, 0};
    AttribMap& set = add(mesh_schema::n_jointsSets);
    write(set, meshJointsSet_schema::n_jointCounts) = {1, 1};
    write(set, meshJointsSet_schema::n_indices) = {4, 5};
    write(set, meshJointsSet_schema::n_weights) = {1};
    ASSERT_TRUE(convertToSingleIndex(mesh_));
    EXPECT_EQ(find(mesh_, mesh_schema::n_positions)->size(), 2u);
    EXPECT_EQ(listOf(find(set, meshJointsSet_schema::n_indices)), (std::vector<u32>{4, 5}));
    // Too few weights for the counts read as missing.
    EXPECT_EQ(find(set, meshJointsSet_schema::n_weights), nullptr);
}

TEST_F(MeshIndex, WrongJointCountsAreDropped) {
    write(mesh_, mesh_schema::n_positions) = {{1, 1, 1}, {2, 1, 1}};
    write(mesh_, mesh_schema::n_positionIndices) = {1, 0, 1};
    AttribMap& set = add(mesh_schema::n_jointsSets);
    write(set, meshJointsSet_schema::n_jointCounts) = {1, 1, 1};
    LogCapture log;
    EXPECT_TRUE(convertToSingleIndex(mesh_));
    EXPECT_TRUE(log.has(2, "box| Wrong joint counts in vertex weights at index 0! Expected 2 "
                           "elements, found 3."));
    EXPECT_EQ(find(set, meshJointsSet_schema::n_jointCounts), nullptr);
}

// An array that is linked from elsewhere must not change there.
TEST_F(MeshIndex, LinkedArraysAreNotRewritten) {
    base::PluginFactory factory;
    const Object source = factory.create(mesh_schema::n_kind);
    const Object object = factory.create(mesh_schema::n_kind);
    write(*source, mesh_schema::n_positions) = {{1, 0, 0}, {2, 0, 0}, {3, 0, 0}};
    object->attribute(mesh_schema::n_positions,
                      new base::AttribLink(base::AttribPath(*source, mesh_schema::n_positions)));
    write(*object, mesh_schema::n_positionIndices) = {2, 1, 0, 2};
    ASSERT_TRUE(convertToSingleIndex(*object));
    EXPECT_EQ(listOf(find(*object, mesh_schema::n_positions)),
              (std::vector<vec3f>{{3, 0, 0}, {2, 0, 0}, {1, 0, 0}}));
    EXPECT_EQ(listOf(find(*source, mesh_schema::n_positions)),
              (std::vector<vec3f>{{1, 0, 0}, {2, 0, 0}, {3, 0, 0}}));
}

class ProgressCapture final : public base::ICustomLog {
public:
    void message(base::name_id, int, base::string_view) override {}
    void progress(u32 percent, base::string_view text) override {
        percents.push_back(percent);
        lastText = text;
    }
    void progressEnd() override { ++ends; }
    std::vector<u32> percents;
    string lastText;
    int ends = 0;
};

TEST_F(MeshIndex, ReportsProgressOfLargeMeshes) {
    const auto output = base::makeRef<ProgressCapture>();
    base::log().addOutput(output);
    write(mesh_, mesh_schema::n_positions).resize(1);
    write(mesh_, mesh_schema::n_positionIndices).resize(250000);
    EXPECT_TRUE(convertToSingleIndex(mesh_));
    base::log().removeOutput(output.get());
    EXPECT_EQ(output->percents, (std::vector<u32>{0, 40, 80}));
    EXPECT_EQ(output->lastText, "Generating master index array for box...");
    EXPECT_EQ(output->ends, 1);
}

} // namespace
