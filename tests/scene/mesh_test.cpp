#include "mesh_builder.h"

#include "log_capture.h"

#include <limits>

namespace {

using namespace scene;
using namespace test_support;
using namespace base;

class Mesh : public MeshTest {};

TEST_F(Mesh, PrimitiveTypes) {
    struct Row {
        vector<u16> topology, vcounts;
        int type, triangulatedType;
    };
    const Row rows[] = {{{}, {1}, 1, 8},       {{}, {2}, 2, 8},      {{}, {3}, 8, 8},
                        {{}, {4}, 64, 8},      {{}, {5}, 128, 8},    {{}, {0}, 128, 8},
                        {{}, {2, 2, 2}, 2, 8}, {{}, {1, 2}, 2, 8},   {{}, {2, 2, 3}, 256, 8},
                        {{}, {3, 3}, 256, 8},  {{}, {}, -1, 8},      {{0}, {4}, 64, 8},
                        {{1}, {4}, 64, 8},     {{2, 5}, {4}, 64, 8}, {{3}, {2}, 4, 4},
                        {{3}, {3}, 16, 16},    {{4}, {}, 16, 16},    {{5}, {2}, 32, 32},
                        {{6, 0}, {}, 32, 32},  {{7}, {2, 2}, 16, 16}};
    for (std::size_t i = 0; i < std::size(rows); ++i) {
        SCOPED_TRACE(i);
        base::AttribMap& primitive = add(mesh_schema::n_primitives);
        const auto index = static_cast<u32>(i);
        if (!rows[i].topology.empty())
            write(primitive, meshPrimitive_schema::n_topology) = rows[i].topology;
        if (!rows[i].vcounts.empty())
            write(primitive, meshPrimitive_schema::n_vcounts) = rows[i].vcounts;
        EXPECT_EQ(getPrimitiveType(mesh_, index, false), rows[i].type);
        EXPECT_EQ(getPrimitiveType(mesh_, index, true), rows[i].type) << "without triIndices";
        write(mesh_, mesh_schema::n_triIndices) = {0, 1, 2};
        EXPECT_EQ(getPrimitiveType(mesh_, index, false), rows[i].type);
        EXPECT_EQ(getPrimitiveType(mesh_, index, true), rows[i].triangulatedType);
        mesh_.removeAttribute(mesh_schema::n_triIndices);
    }
    EXPECT_EQ(getPrimitiveType(mesh_, 1000, true), -1);
    // Single values in place of lists.
    base::AttribMap& primitive = add(mesh_schema::n_primitives);
    primitive.attribute<u16>(meshPrimitive_schema::n_topology) = 4;
    primitive.attribute<u16>(meshPrimitive_schema::n_vcounts) = 2;
    EXPECT_EQ(getPrimitiveType(mesh_, std::size(rows), false), 4);
}

TEST_F(Mesh, PrimitiveRanges) {
    add(mesh_schema::n_primitives);
    base::AttribMap& stored = add(mesh_schema::n_primitives);
    setRange(stored, 6, 9);
    base::AttribMap& both = add(mesh_schema::n_primitives);
    setRange(both, 1, 2);
    write(both, meshPrimitive_schema::n_triIndexStart) = 30;
    write(both, meshPrimitive_schema::n_triIndexCount) = 12;
    EXPECT_EQ(getPrimitiveIndexCount(mesh_, 0, false), 0u);
    write(mesh_, mesh_schema::n_indices) = {0, 1, 2, 3};
    EXPECT_EQ(getPrimitiveIndexCount(mesh_, 0, true), 4u);
    write(mesh_, mesh_schema::n_triIndices) = {0, 1, 2, 0, 2, 3};
    struct Row {
        u32 index;
        bool triangulated;
        u32 start, count;
    };
    const Row rows[] = {{0, false, 0, 4}, {0, true, 0, 6},  {1, false, 6, 9},
                        {1, true, 6, 9},  {2, false, 1, 2}, {2, true, 30, 12}};
    for (const Row& row : rows) {
        EXPECT_EQ(getPrimitiveIndexStart(mesh_, row.index, row.triangulated), row.start);
        EXPECT_EQ(getPrimitiveIndexCount(mesh_, row.index, row.triangulated), row.count);
    }
    EXPECT_EQ(getPrimitiveIndexStart(mesh_, 3, true), 0u);
}

TEST_F(Mesh, ListsOfMapsAndOfObjects) {
    LogCapture log;
    EXPECT_EQ(getListCount(mesh_, mesh_schema::n_uvSets), 0u);
    EXPECT_EQ(findListItem(mesh_, mesh_schema::n_uvSets, 0), nullptr);
    base::AttribMap& set = add(mesh_schema::n_uvSets);
    write(mesh_, mesh_schema::n_uvSets).append(nullptr);
    write(mesh_, mesh_schema::n_uvSets).append(new base::TypedAttribute<float>(1));
    EXPECT_EQ(getListCount(mesh_, mesh_schema::n_uvSets), 3u);
    EXPECT_EQ(findListItem(mesh_, mesh_schema::n_uvSets, 0), &set);
    for (const u32 gap : {1u, 2u, 3u, 0xffffffffu})
        EXPECT_EQ(findListItem(mesh_, mesh_schema::n_uvSets, gap), nullptr);

    base::PluginFactory factory;
    const Object object = factory.create(mesh_schema::n_kind);
    mesh_.vecAttribute<Object>(mesh_schema::n_primitives) = {object, Object()};
    EXPECT_EQ(getListCount(mesh_, mesh_schema::n_primitives), 2u);
    EXPECT_EQ(findListItem(mesh_, mesh_schema::n_primitives, 0), object.get());
    EXPECT_EQ(findListItem(mesh_, mesh_schema::n_primitives, 1), nullptr);
    EXPECT_EQ(findListItem(mesh_, mesh_schema::n_primitives, 2), nullptr);
    EXPECT_TRUE(log.entries().empty());

    mesh_.vecAttribute<float>(mesh_schema::n_colorSets) = {1, 2};
    EXPECT_EQ(getListCount(mesh_, mesh_schema::n_colorSets), 0u);
    EXPECT_EQ(findListItem(mesh_, mesh_schema::n_colorSets, 0), nullptr);
    EXPECT_EQ(log.entries().size(), 2u);
}

TEST_F(Mesh, BoundsOfFinitePoints) {
    const float nan = std::numeric_limits<float>::quiet_NaN();
    const float inf = std::numeric_limits<float>::infinity();
    EXPECT_TRUE(getGeometryBounds(mesh_).isEmpty());
    write(mesh_, mesh_schema::n_positions) = {{nan, 9, 9}, {1, -2, 3}, {9, inf, 9}, {-1, 5, 0}};
    const box3f box{{-1, -2, 0}, {1, 5, 3}};
    EXPECT_EQ(getGeometryBounds(mesh_), box);
    // What is stored wins, even if it does not fit, unless it is no box.
    box3f& stored = write(mesh_, geometry_schema::n_bounds);
    stored = {{0, 0, 0}, {1, 1, 1}};
    EXPECT_EQ(getGeometryBounds(mesh_), stored);
    for (const box3f& bad :
         {box3f(), box3f{{0, 0, nan}, {1, 1, 1}}, box3f{{0, 0, 0}, {1, inf, 1}}}) {
        stored = bad;
        EXPECT_EQ(getGeometryBounds(mesh_), box);
    }
    LogCapture log;
    base::AttribMap lines;
    lines.vecAttribute<base::vec4f>(lines_schema::n_points) = {{1, 2, 3, nan}, {0, 4, 0, 1}};
    EXPECT_EQ(getGeometryBounds(lines), (box3f{{0, 2, 0}, {1, 4, 3}}));
    EXPECT_TRUE(log.entries().empty());
}

class MeshValidation : public MeshTest {
protected:
    MeshValidation() {
        write(mesh_, mesh_schema::n_positions) = {{0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0, 1, 0}};
        write(mesh_, mesh_schema::n_normals) = {{0, 0, 1}};
        write(mesh_, mesh_schema::n_normalIndices) = {0, 0, 0, 0, 0, 0};
        for (const auto* name :
             {&mesh_schema::n_indices, &mesh_schema::n_triIndices, &mesh_schema::n_positionIndices})
            write(mesh_, *name) = {0, 1, 2, 0, 2, 3};
        primitive_ = &addPrimitive({3});
    }
    base::AttribMap* primitive_;
};

TEST_F(MeshValidation, ReportsEachFault) {
    struct Row {
        void (*spoil)(base::AttribMap& mesh, base::AttribMap& primitive);
        int level;
        const char* text;
    };
    using base::AttribMap;
    const Row rows[] = {
        {[](AttribMap& m, AttribMap&) {
             write(m, mesh_schema::n_velocities) = {{}, {}, {}};
         },
         2, "Wrong number of velocities! Expected 4 elements, found 3."},
        {[](AttribMap& m, AttribMap&) { m.removeAttribute(mesh_schema::n_normalIndices); }, 2,
         "Wrong number of normals! Expected 4 elements, found 1."},
        {[](AttribMap&, AttribMap& p) {
             write(p, meshPrimitive_schema::n_indexStart) = 1;
             write(p, meshPrimitive_schema::n_indexCount) = 5;
         },
         2, "Index offset/count out of bounds 1-5 out of 6!"},
        {[](AttribMap&, AttribMap& p) {
             write(p, meshPrimitive_schema::n_triIndexStart) = 0xffffffff;
             write(p, meshPrimitive_schema::n_triIndexCount) = 2;
         },
         2, "Index offset/count out of bounds 4294967295-2 out of 6!"},
        {[](AttribMap&, AttribMap& p) { write(p, meshPrimitive_schema::n_topology) = {2}; }, 3,
         "Found primitive from unknown type!!"},
        {[](AttribMap&, AttribMap& p) { p.removeAttribute(meshPrimitive_schema::n_vcounts); }, 3,
         "Found primitive from unknown type!!"},
        {[](AttribMap&, AttribMap& p) {
             write(p, meshPrimitive_schema::n_vcounts) = {3, 4};
         },
         2, "Invalid face vertex counts. Expected 6, got 7!"},
        {[](AttribMap&, AttribMap& p) { write(p, meshPrimitive_schema::n_vcounts) = {4}; }, 2,
         "Invalid face vertex count 4!"},
        {[](AttribMap&, AttribMap& p) { write(p, meshPrimitive_schema::n_vcounts) = {0}; }, 2,
         "Invalid face vertex count 0!"},
        {[](AttribMap& m, AttribMap&) { m.removeAttribute(mesh_schema::n_primitives); }, 3,
         "Mesh doesn't contain any primitives!"},
        {[](AttribMap& m, AttribMap&) {
             write(m, mesh_schema::n_triIndices) = {0, 1, 2};
         },
         3, "Triangulated indices mismatch!"},
        {[](AttribMap& m, AttribMap&) { write(m, mesh_schema::n_indices) = {0, 1, 2, 4, 9, 3}; }, 2,
         "Found face index out of range at position 3!"},
        {[](AttribMap& m, AttribMap&) { m.removeAttribute(mesh_schema::n_positionIndices); }, 3,
         "Missing position indices!"},
        {[](AttribMap& m, AttribMap&) {
             write(m, mesh_schema::n_positionIndices) = {0, 1, 2, 0, 2, 0xffffffff};
         },
         2, "Found position index out of range at position 5!"},
        {[](AttribMap& m, AttribMap&) {
             write(m, mesh_schema::n_normalIndices) = {0, 1};
         },
         2, "Found normal index out of range at position 1!"},
        {[](AttribMap& m, AttribMap&) { write(m, mesh_schema::n_tangentIndices) = {0}; }, 2,
         "Found normal index out of range at position 0!"}};
    {
        LogCapture log;
        EXPECT_TRUE(validate(mesh_, "m", true, true));
        EXPECT_TRUE(log.entries().empty());
    }
    for (const Row& row : rows) {
        const std::unique_ptr<base::Attribute> copy(mesh_.clone());
        base::AttribMap& mesh = *copy->asMap();
        row.spoil(mesh, *findListItem(mesh, mesh_schema::n_primitives, 0));
        LogCapture log;
        EXPECT_FALSE(validate(mesh, "m", true, true));
        EXPECT_EQ(linesOf(log), format("{} validate |m| {}\n", row.level, row.text));
    }
}

TEST_F(MeshValidation, ReportsMissingData) {
    LogCapture log;
    addPrimitive({3});
    EXPECT_FALSE(validate(mesh_, "m", false, false));
    for (const char* text :
         {"validate |m| Missing start index!", "validate |m| Missing index count!",
          "validate |m| Missing triangle start index!",
          "validate |m| Missing triangle index count!"})
        EXPECT_TRUE(log.has(2, text)) << text;
    EXPECT_EQ(log.take().size(), 8u);

    base::AttribMap empty;
    EXPECT_FALSE(validate(empty, "e", true, false));
    EXPECT_TRUE(log.has(2, "validate |e| The vertex positions are missing!"));
    EXPECT_TRUE(log.has(3, "validate |e| Missing indices!"));
}

TEST_F(MeshValidation, NamesTheArraysOfSets) {
    LogCapture log;
    base::AttribMap& colors = add(mesh_schema::n_colorSets);
    write(colors, meshColorSet_schema::n_RGB) = {{}};
    write(colors, meshColorSet_schema::n_RGBA) = {{}};
    base::AttribMap& uvs = add(mesh_schema::n_uvSets);
    write(uvs, meshUVSet_schema::n_UV) = {{}};
    write(uvs, meshUVSet_schema::n_UVW) = {{}};
    write(uvs, meshUVSet_schema::n_UVWQ) = {{}};
    EXPECT_FALSE(validate(mesh_, "m", false, false));
    for (const char* label :
         {"rgb colors", "rgba colors", "uv coordinates", "uvw coordinates", "uvwq coordinates"})
        EXPECT_TRUE(log.has(2, "validate |m| Wrong number of " + string(label) +
                                   "! Expected 4 elements, found 1."))
            << label;
    EXPECT_EQ(log.entries().size(), 5u);
    // With indices of their own the arrays may be of any length.
    write(colors, meshColorSet_schema::n_indices) = {0, 0, 0, 0, 0, 0};
    write(uvs, meshUVSet_schema::n_indices) = {0, 0, 0, 0, 0, 0};
    EXPECT_TRUE(validate(mesh_, "m", false, false));
}

} // namespace
