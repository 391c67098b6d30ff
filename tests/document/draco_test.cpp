#include "document_support.h"

#include <draco/compression/decode.h>
#include <draco/mesh/mesh.h>

#include <cmath>
#include <random>
#include <set>

namespace document_test {
namespace {

using Type = Accessor::Type;

ref<Accessor> floats(Type type, const std::vector<float>& values) {
    const auto count = static_cast<i32>(values.size()) / Accessor::numberOfComponents(type);
    return makeRef<Accessor>(type, componentFloat, values.data(), count, BufferView::arrayBuffer);
}

ref<Buffer> bufferOf(const std::vector<u32>& indices) {
    return makeRef<Buffer>(indices.data(), static_cast<i32>(indices.size() * sizeof(u32)), true);
}

/// A bumpy grid of side x side vertices with every kind of attribute, in random values.
struct Grid {
    explicit Grid(u32 side) {
        std::mt19937 random(5);
        std::uniform_real_distribution<float> unit(0, 1);
        std::vector<float> positions, normals, uvs, colors, tangents;
        std::vector<base::u16> joints;
        for (u32 i = 0; i < side * side; ++i) {
            const float x = static_cast<float>(i % side), y = static_cast<float>(i / side);
            positions.insert(positions.end(), {x * 3, y * 2, unit(random)});
            const float a = unit(random), b = unit(random), length = std::sqrt(1 + a * a + b * b);
            normals.insert(normals.end(), {a / length, b / length, 1 / length});
            uvs.insert(uvs.end(), {unit(random), unit(random)});
            colors.insert(colors.end(), {unit(random), unit(random), unit(random)});
            tangents.insert(tangents.end(), {unit(random), unit(random), unit(random), 1});
            for (u32 c = 0; c < 4; ++c)
                joints.push_back(static_cast<base::u16>(random()));
        }
        for (u32 y = 0; y + 1 < side; ++y) {
            for (u32 x = 0; x + 1 < side; ++x) {
                const u32 a = y * side + x, b = a + 1, c = a + side, d = c + 1;
                indices.insert(indices.end(), {a, b, c, b, d, c});
            }
        }
        attributes["POSITION"] = floats(Type::vec3, positions);
        attributes["NORMAL"] = floats(Type::vec3, normals);
        attributes["TEXCOORD_0"] = floats(Type::vec2, uvs);
        attributes["TEXCOORD_1"] = floats(Type::vec2, normals); // of another range
        attributes["TEXCOORD_1"]->count = static_cast<i32>(side * side);
        attributes["COLOR_0"] = floats(Type::vec3, colors);
        attributes["TANGENT"] = floats(Type::vec4, tangents);
        attributes["JOINTS_0"] =
            makeRef<Accessor>(Type::vec4, componentU16, joints.data(),
                              static_cast<i32>(side * side), BufferView::arrayBuffer);
    }

    ref<DracoExtension> compressed() {
        string reason;
        return DracoExtension::make(attributes, bufferOf(indices), reason);
    }

    AttributeMap attributes;
    std::vector<u32> indices;
};

std::unique_ptr<draco::Mesh> decoded(const BufferView& view) {
    draco::DecoderBuffer buffer;
    buffer.Init(reinterpret_cast<const char*>(view.buffer->data) + view.byteOffset,
                static_cast<std::size_t>(view.byteLength));
    return draco::Decoder().DecodeMeshFromBuffer(&buffer).value();
}

/// Half a step of the quantisation of an accessor, with a little for float arithmetic.
float quantum(const Accessor& accessor, int bits) {
    float range = 0;
    for (std::size_t c = 0; c < static_cast<std::size_t>(accessor.getNumberOfComponents()); ++c)
        range = std::max(range, accessor.max[c] - accessor.min[c]);
    return range / static_cast<float>((1 << bits) - 1) * 0.501f;
}

/// The values of a point of the stream, under the id that the extension names.
std::vector<float> decodedValues(const draco::Mesh& mesh, i32 id, draco::PointIndex point) {
    const draco::PointAttribute* attribute = mesh.GetAttributeByUniqueId(static_cast<u32>(id));
    std::vector<float> values(static_cast<std::size_t>(attribute->num_components()));
    attribute->ConvertValue<float>(attribute->mapped_index(point), attribute->num_components(),
                                   values.data());
    return values;
}

TEST(Draco, DecodesToTheSourceWithinTheQuantisation) {
    Grid grid(20);
    const ref<DracoExtension> extension = grid.compressed();
    ASSERT_TRUE(extension);
    ASSERT_TRUE(extension->encode({}));
    const auto mesh = decoded(*extension->bufferView);
    ASSERT_EQ(mesh->num_faces() * 3, grid.indices.size());
    ASSERT_EQ(mesh->num_points(), 400u);

    // The stream has the vertices in its own order: the rounded place in the grid tells which.
    std::vector<u32> source(mesh->num_points());
    const i32 positionId = extension->attributeToId.find("POSITION");
    for (u32 point = 0; point < mesh->num_points(); ++point) {
        const auto p = decodedValues(*mesh, positionId, draco::PointIndex(point));
        source[point] = static_cast<u32>(std::lround(p[1] / 2) * 20 + std::lround(p[0] / 3));
    }
    const std::map<string, int> bits{{"POSITION", 14}, {"TEXCOORD_0", 10}, {"TEXCOORD_1", 10},
                                     {"COLOR_0", 8},   {"TANGENT", 8},     {"JOINTS_0", 30}};
    for (const auto& [name, accessor] : std::as_const(grid.attributes)) {
        const float tolerance =
            // Octahedral coordinates of ten bits: the angle errs by up to 2 / 511 and a little.
            name == "NORMAL" ? 0.005f : quantum(*accessor, bits.at(name));
        for (u32 point = 0; point < mesh->num_points(); ++point) {
            float expected[16];
            accessor->getComponentsAtIndex(static_cast<i32>(source[point]), expected);
            const auto found =
                decodedValues(*mesh, extension->attributeToId.find(name), draco::PointIndex(point));
            for (std::size_t c = 0; c < found.size(); ++c)
                ASSERT_NEAR(found[c], expected[c], tolerance) << name << " of point " << point;
        }
    }

    // A face may start at another corner, but keeps its direction.
    const auto normalised = [](u32 a, u32 b, u32 c) {
        std::array<u32, 3> face{a, b, c};
        std::rotate(face.begin(), std::min_element(face.begin(), face.end()), face.end());
        return face;
    };
    std::multiset<std::array<u32, 3>> expected, found;
    for (u32 f = 0; f < mesh->num_faces(); ++f) {
        const auto& face = mesh->face(draco::FaceIndex(f));
        const u32* corners = &grid.indices[std::size_t(f) * 3];
        expected.insert(normalised(corners[0], corners[1], corners[2]));
        found.insert(
            normalised(source[face[0].value()], source[face[1].value()], source[face[2].value()]));
    }
    EXPECT_EQ(found, expected);
}

TEST(Draco, TakesEveryThreeVerticesWithoutIndices) {
    AttributeMap attributes;
    attributes["POSITION"] =
        floats(Type::vec3, {0, 0, 0, 1, 0, 0, 0, 1, 0, 5, 0, 0, 6, 0, 0, 5, 1, 0, 9, 9, 9});
    string reason;
    const auto extension = DracoExtension::make(attributes, nullptr, reason);
    ASSERT_TRUE(extension) << reason;
    ASSERT_TRUE(extension->encode({}));
    EXPECT_EQ(decoded(*extension->bufferView)->num_faces(), 2u);
}

TEST(Draco, RefusesWhatTheEncoderCanNotTake) {
    constexpr float nan = NAN, infinity = INFINITY, huge = 3e38f;
    const std::vector<u32> triangle{0, 1, 2};
    const auto points = [](float x) { return floats(Type::vec3, {x, 0, 0, 1, 0, 0, 0, 1, 0}); };
    const auto scalars = [](std::vector<float> values) { return floats(Type::scalar, values); };
    const auto bytes = makeRef<Accessor>(Type::scalar, componentU8, "abc", 3, -1);
    const auto cut =
        makeRef<Accessor>(Type::scalar, componentFloat, 0, 3, viewOf(std::vector<float>{1, 2}));
    const auto noData = makeRef<Accessor>(Type::scalar, componentFloat);
    const struct {
        const char* name;
        ref<Accessor> position, other;
        std::vector<u32> indices;
        bool isTaken;
    } rows[] = {{"sound", points(0), nullptr, triangle, true},
                {"large", points(huge), nullptr, triangle, true},
                {"one sound face", points(0), nullptr, {0, 0, 1, 0, 1, 2, 1}, true},
                {"no position", nullptr, points(0), triangle, false},
                {"no vertex", floats(Type::vec3, {}), nullptr, {}, false},
                {"no face", points(0), nullptr, {0, 1}, false},
                {"degenerate", points(0), nullptr, {0, 1, 0, 2, 2, 1}, false},
                {"index", points(0), nullptr, {0, 1, 3}, false},
                {"counts", points(0), scalars({1, 2}), triangle, false},
                {"NaN", points(nan), nullptr, triangle, false},
                {"infinity", points(-infinity), nullptr, triangle, false},
                {"other NaN", points(0), scalars({1, nan, 2}), triangle, false},
                {"range", points(0), scalars({huge, 0, -huge}), triangle, false},
                {"NORMAL", points(0), scalars({1, 2, 3}), triangle, false},
                {"bytes", points(0), bytes, triangle, false},
                {"cut", points(0), cut, triangle, false},
                {"no data", points(0), noData, triangle, false}};
    for (const auto& row : rows) {
        AttributeMap attributes;
        if (row.position)
            attributes["POSITION"] = row.position;
        if (row.other)
            attributes[row.name] = row.other;
        string reason = "old";
        const auto extension = DracoExtension::make(attributes, bufferOf(row.indices), reason);
        EXPECT_EQ(extension != nullptr, row.isTaken) << row.name << ": " << reason;
        EXPECT_EQ(reason.empty(), row.isTaken) << row.name;
        if (extension) {
            EXPECT_TRUE(extension->encode({})) << row.name;
        }
    }
}

// The order of the chained hash table that writes such files elsewhere.
TEST(Draco, ListsAttributesInTheOrderOfTheirTable) {
    const std::map<char, string> words{{'N', "NORMAL"},     {'P', "POSITION"}, {'A', "TANGENT"},
                                       {'T', "TEXCOORD_0"}, {'C', "COLOR_0"},  {'J', "JOINTS_0"},
                                       {'W', "WEIGHTS_0"}};
    const struct {
        const char *inserted, *listed;
    } rows[] = {{"NP", "PN"},     {"PT", "TP"},       {"NPT", "NTP"},        {"CNPT", "CNTP"},
                {"NPAT", "ANTP"}, {"JNPTW", "NWTPJ"}, {"CJNPATW", "PTCWJNA"}};
    for (const auto& row : rows) {
        DracoAttributeIds ids;
        i32 id = 0;
        for (const char c : string(row.inserted))
            ids.insert(words.at(c), id++);
        string listed;
        for (const auto& [name, value, hash] : ids.entries()) {
            for (const auto& [letter, word] : words) {
                if (word == name)
                    listed += letter;
            }
            EXPECT_EQ(string(row.inserted)[static_cast<std::size_t>(value)], listed.back());
            EXPECT_EQ(ids.find(name), value);
        }
        EXPECT_EQ(listed, row.listed);
        EXPECT_EQ(ids.find("TEXCOORD_9"), -1);
    }
}

/// A document with a compressed mesh of two primitives and a plain mesh.
struct CompressedDocument {
    CompressedDocument() {
        Grid grid(4);
        extension = grid.compressed();
        options.useDraco = options.binary = true;
        auto node = meshNode(makeRef<Primitive>());
        node->mesh->primitives.push_back(makeRef<Primitive>());
        for (i32 i = 0; i < 2; ++i) {
            Primitive& primitive = *node->mesh->primitives[static_cast<std::size_t>(i)];
            primitive.attributes["POSITION"] = grid.attributes["POSITION"];
            primitive.indices = makeRef<Accessor>(Type::scalar, componentU32,
                                                  grid.indices.data() + 27 * i, 27, 34963);
            primitive.mode = 4;
            primitive.extensions[dracoExtensionName] = extension;
            EXPECT_EQ(primitive.draco(), extension.get());
        }
        auto plain = makeRef<Primitive>();
        plain->attributes["POSITION"] = floats(Type::vec3, {0, 0, 0});
        asset.getDefaultScene().nodes.push_back(meshNode(plain));
        asset.getDefaultScene().nodes.push_back(node);
    }

    ref<DracoExtension> extension;
    Options options;
    Asset asset;
};

TEST(Draco, TakesThePlainDataOutOfTheDocument) {
    CompressedDocument document;
    Asset& asset = document.asset;
    asset.removeUncompressedBufferViews();
    ASSERT_TRUE(asset.compressPrimitives(document.options));
    const BufferView& view = *document.extension->bufferView;
    const std::vector<u8> stream(view.buffer->data, view.buffer->data + view.byteLength);
    EXPECT_EQ(asset.getAllCompressedBufferViews(),
              (vector<BufferView*>{document.extension->bufferView.get()}));
    const ref<Buffer> buffer = asset.packAccessors();
    const string text = documentText(asset, document.options);

    // The plain mesh's twelve bytes come first, then the stream.
    const string length = std::to_string(stream.size());
    EXPECT_EQ(std::vector<u8>(buffer->data + 12, buffer->data + buffer->byteLength), stream);
    const string draco = R"("extensions":{"KHR_draco_mesh_compression":{"bufferView":0,)"
                         R"("attributes":{)";
    const auto first = text.find(draco);
    ASSERT_NE(first, string::npos);
    EXPECT_NE(text.find(draco, first + 1), string::npos);
    EXPECT_NE(text.find(R"({"componentType":5125,"count":27,"max":[)"), string::npos);
    EXPECT_NE(
        text.find(R"("bufferViews":[{"buffer":0,"byteOffset":12,"byteLength":)" + length + "},{"),
        string::npos);
    EXPECT_NE(text.find(R"("extensionsRequired":["KHR_draco_mesh_compression"])"), string::npos);
}

TEST(Draco, EndsThePassAtTheFirstFailure) {
    CompressedDocument document;
    document.options.positionBits = 40;
    document.asset.removeUncompressedBufferViews();
    EXPECT_FALSE(document.asset.compressPrimitives(document.options));
    EXPECT_EQ(document.extension->bufferView, nullptr);
    EXPECT_TRUE(document.asset.getAllCompressedBufferViews().empty());
    document.asset.packAccessors();
    EXPECT_NE(documentText(document.asset, document.options)
                  .find(R"("KHR_draco_mesh_compression":{"attributes":{)"),
              string::npos);
}

} // namespace
} // namespace document_test
