#include "gltf_faults.h"
#include "gltf_pose.h"
#include "gltf_reader.h"
#include "gltf_statistics.h"

#include <draco/compression/encode.h>
#include <draco/mesh/mesh.h>
#include <gtest/gtest.h>

#include <cmath>
#include <cstring>

namespace test_support {
namespace {

void append(Bytes& bytes, const void* data, size_t size) {
    bytes.resize(bytes.size() + size);
    std::memcpy(bytes.data() + bytes.size() - size, data, size);
}

/// A container of the parts as given.
Bytes makeGlb(const std::string& json, const Bytes& binary) {
    const uint32_t binaryType = 0x004E4942;
    const uint32_t lengths[] = {static_cast<uint32_t>(json.size()),
                                static_cast<uint32_t>(binary.size())};
    const uint32_t header[] = {0x46546C67, 2, 28 + lengths[0] + lengths[1], lengths[0], 0x4E4F534A};
    Bytes bytes;
    append(bytes, header, sizeof(header));
    append(bytes, json.data(), json.size());
    append(bytes, &lengths[1], 4);
    append(bytes, &binaryType, 4);
    append(bytes, binary.data(), binary.size());
    return bytes;
}

/// Two right triangles in a quad of 3 x 4, two nodes that draw it: one at twice the size and
/// turned by 90 degrees about Z, its child mirrored in X and moved by (1, 0, 5).
/// Bytes: 4 positions of 12 at a stride of 16 (the gap holds a colour), 6 short indices.
const std::string quadJson = R"({"asset":{"version":"2.0"},"scene":0,"scenes":[{"nodes":[1]}],
"nodes":[{"mesh":0,"matrix":[-1,0,0,0, 0,1,0,0, 0,0,1,0, 1,0,5,1]},
{"mesh":0,"children":[0],"scale":[2,2,2],"rotation":[0,0,0.7071067811865476,0.7071067811865476]}],
"meshes":[{"primitives":[{"attributes":{"POSITION":0,"COLOR_0":1},"indices":2}]}],
"accessors":[
{"bufferView":0,"componentType":5126,"count":4,"type":"VEC3","min":[0,0,0],"max":[3,4,0]},
{"bufferView":0,"byteOffset":12,"componentType":5121,"normalized":true,"count":4,"type":"VEC4"},
{"bufferView":1,"componentType":5123,"count":6,"type":"SCALAR"}],
"bufferViews":[{"buffer":0,"byteLength":64,"byteStride":16},
{"buffer":0,"byteOffset":64,"byteLength":12}],
"buffers":[{"byteLength":76}]})";

Bytes quadBytes() {
    const float corners[4][3] = {{0, 0, 0}, {3, 0, 0}, {3, 4, 0}, {0, 4, 0}};
    const uint8_t colour[4] = {0, 51, 102, 255};
    const uint16_t indices[6] = {0, 1, 2, 0, 2, 3};
    Bytes bytes;
    for (const auto& corner : corners) {
        append(bytes, corner, sizeof(corner));
        append(bytes, colour, sizeof(colour));
    }
    append(bytes, indices, sizeof(indices));
    return bytes;
}

Bytes padded(Bytes bytes) {
    bytes.resize((bytes.size() + 3) / 4 * 4);
    return bytes;
}

std::string padded(std::string json) {
    return json.append((4 - json.size() % 4) % 4, ' ');
}

TEST(GltfReader, ReadsContainer) {
    const GltfFile file = GltfFile::fromBinary(makeGlb(padded(quadJson), quadBytes()));
    EXPECT_TRUE(findFaults(file).empty());
    const AccessorValues colours = file.accessor(1);
    ASSERT_EQ(colours.values.size(), 16U);
    EXPECT_DOUBLE_EQ(colours.at(3)[1], 0.2);
    EXPECT_DOUBLE_EQ(colours.at(3)[3], 1.0);

    const Statistics statistics = statisticsOf(file);
    EXPECT_EQ(statistics.nodes, 2U);
    EXPECT_EQ(statistics.vertices, 4U);
    EXPECT_EQ(statistics.stored.triangles, 2U);
    EXPECT_DOUBLE_EQ(statistics.stored.area, 12);
    EXPECT_EQ(statistics.drawn.triangles, 4U);
    EXPECT_NEAR(statistics.drawn.area, 2 * 12 * 4, 1e-9);
    // The turn takes (x, y) to (-2y, 2x); the child spans x -2..1, y 0..4 at z = 5 before it.
    // Seen from the origin the mirrored child is the base of a cone of height 10, wound clockwise.
    const Vector min{-8, -4, 0}, max{0, 6, 10};
    for (size_t axis = 0; axis < 3; ++axis) {
        EXPECT_NEAR(statistics.drawn.bounds.min[axis], min[axis], 1e-9);
        EXPECT_NEAR(statistics.drawn.bounds.max[axis], max[axis], 1e-9);
    }
    EXPECT_NEAR(statistics.drawn.volume, -48.0 * 10 / 3, 1e-9);
}

TEST(GltfReader, ReportsWhatDeclarationsGetWrong) {
    const auto faultsWith = [](const char* from, const char* to, Bytes bytes = quadBytes()) {
        std::string json = quadJson;
        json.replace(json.find(from), std::strlen(from), to);
        std::string kinds;
        for (const Fault& fault : findFaults(GltfFile::fromBinary(makeGlb(padded(json), bytes)))) {
            kinds += fault.kind + " " + fault.text.substr(0, fault.text.find(':')) + ";";
        }
        return kinds;
    };
    EXPECT_EQ(faultsWith("[3,4,0]", "[3,4.5,0]"), "limits /accessors/0;");
    Bytes shifted = quadBytes();
    shifted.insert(shifted.begin() + 64, 0);
    EXPECT_EQ(faultsWith("\"byteOffset\":64,\"byteLength\":12}],\n\"buffers\":[{\"byteLength\":76",
                         "\"byteOffset\":65,\"byteLength\":12}],\n\"buffers\":[{\"byteLength\":77",
                         padded(shifted)),
              "alignment /accessors/2;");
    Bytes infinite = quadBytes();
    infinite[2] = 0x80;
    infinite[3] = 0x7F;
    EXPECT_EQ(faultsWith("2.0", "2.0", infinite), "not-finite /accessors/0;");
    EXPECT_EQ(faultsWith(R"("asset")", R"("images":[{"uri":"data:image/png;base64,"}],"asset")"),
              "image /images/0;");
}

/// A tetrahedron with one face more that has two equal corners, which the encoder drops. The
/// position is the second attribute, behind one that holds the number of the vertex.
Bytes encodeTetrahedron() {
    const float positions[4][3] = {{0, 0, 0}, {10, 0, 0}, {0, 10, 0}, {0, 0, 10}};
    const uint16_t numbers[4] = {7, 8, 9, 10};
    const uint32_t faces[5][3] = {{0, 2, 1}, {0, 1, 3}, {0, 3, 2}, {1, 2, 3}, {1, 1, 3}};
    draco::Mesh mesh;
    mesh.SetNumFaces(5);
    mesh.set_num_points(4);
    for (uint32_t f = 0; f < 5; ++f) {
        mesh.SetFace(draco::FaceIndex(f),
                     {draco::PointIndex(faces[f][0]), draco::PointIndex(faces[f][1]),
                      draco::PointIndex(faces[f][2])});
    }
    const auto add = [&](draco::GeometryAttribute::Type type, int8_t components,
                         draco::DataType dataType, int64_t size, const void* data) {
        draco::GeometryAttribute attribute;
        attribute.Init(type, nullptr, components, dataType, false, size, 0);
        draco::PointAttribute* added = mesh.attribute(mesh.AddAttribute(attribute, true, 4));
        added->buffer()->Write(0, data, static_cast<size_t>(size) * 4);
    };
    add(draco::GeometryAttribute::GENERIC, 1, draco::DT_UINT16, 2, numbers);
    add(draco::GeometryAttribute::POSITION, 3, draco::DT_FLOAT32, 12, positions);
    draco::Encoder encoder;
    encoder.SetAttributeQuantization(draco::GeometryAttribute::POSITION, 14);
    draco::EncoderBuffer buffer;
    EXPECT_TRUE(encoder.EncodeMeshToBuffer(mesh, &buffer).ok());
    Bytes bytes;
    append(bytes, buffer.data(), buffer.size());
    return padded(bytes);
}

TEST(GltfReader, DecodesDraco) {
    const Bytes stream = encodeTetrahedron();
    const std::string length = std::to_string(stream.size());
    const std::string json = R"({"scenes":[{"nodes":[0]}],"nodes":[{"mesh":0,"scale":[1,1,-3]}],
"meshes":[{"primitives":[{"attributes":{"POSITION":0,"_NUMBER":1},"indices":2,"extensions":{
"KHR_draco_mesh_compression":{"bufferView":0,"attributes":{"POSITION":1,"_NUMBER":0}}}}]}],
"accessors":[
{"componentType":5126,"count":4,"type":"VEC3","min":[0,0,0],"max":[10,10,10]},
{"componentType":5123,"count":4,"type":"SCALAR"},{"componentType":5125,"count":15,"type":"SCALAR"}],
"bufferViews":[{"buffer":0,"byteLength":)" +
                             length + R"(}],"buffers":[{"byteLength":)" + length + "}]}";
    const GltfFile file = GltfFile::fromBinary(makeGlb(padded(json), stream));
    const Primitive primitive = file.primitive(0, 0);
    ASSERT_TRUE(primitive.compressed);
    ASSERT_EQ(primitive.indices.size(), 12U);
    const AccessorValues& positions = primitive.attributes.at("POSITION");
    const AccessorValues& numbers = primitive.attributes.at("_NUMBER");
    for (size_t i = 0; i < positions.count; ++i) {
        // Vertex 7 is the origin, 8 to 10 lie on the axes.
        for (size_t axis = 0; axis < 3; ++axis) {
            EXPECT_NEAR(positions.at(i)[axis],
                        numbers.at(i)[0] == static_cast<double>(8 + axis) ? 10 : 0, 1e-5);
        }
    }

    // Three right triangles and one that is equilateral, then stretched along Z and mirrored.
    const Statistics statistics = statisticsOf(file);
    EXPECT_NEAR(statistics.stored.area, 3 * 50 + std::sqrt(3) / 4 * 200, 1e-4);
    EXPECT_NEAR(statistics.stored.volume, 1000.0 / 6, 1e-3);
    EXPECT_NEAR(statistics.drawn.volume, -3 * 1000.0 / 6, 1e-2);
    EXPECT_NEAR(statistics.drawn.bounds.min[2], -30, 1e-4);
    EXPECT_NEAR(statistics.positionError[0], 10.0 / 16383 / 2, 1e-9);
    EXPECT_NEAR(statistics.positionError[2], 30.0 / 16383 / 2, 1e-9);

    const std::vector<Fault> faults = findFaults(file);
    ASSERT_EQ(faults.size(), 1U);
    EXPECT_EQ(faults[0].kind, "draco-count");
    EXPECT_EQ(faults[0].text, "/accessors/2: declared 15 elements, the stream has 12");
}

/// A triangle on two joints, the second two units above the first and turned by 90 degrees about Z
/// within two seconds, while a target lifts all vertices by 1 along Z. The node of the mesh stands
/// elsewhere, which means nothing for skins.
const std::string rigJson = R"({"asset":{"version":"2.0"},"scenes":[{"nodes":[0,1]}],
"nodes":[{"mesh":0,"skin":0,"translation":[100,0,0]},{"children":[2]},{"translation":[0,2,0]}],
"skins":[{"joints":[1,2],"inverseBindMatrices":3}],
"meshes":[{"weights":[0.25],"primitives":[{"attributes":{"POSITION":0,"JOINTS_0":1,"WEIGHTS_0":2},
"targets":[{"POSITION":7}]}]}],
"animations":[{"channels":[{"sampler":0,"target":{"node":2,"path":"rotation"}},
{"sampler":1,"target":{"node":0,"path":"weights"}}],
"samplers":[{"input":4,"output":5},{"input":4,"output":6,"interpolation":"LINEAR"}]}],
"accessors":[
{"bufferView":0,"componentType":5126,"count":3,"type":"VEC3"},
{"bufferView":0,"byteOffset":36,"componentType":5121,"count":3,"type":"VEC4"},
{"bufferView":0,"byteOffset":48,"componentType":5126,"count":3,"type":"VEC4"},
{"bufferView":0,"byteOffset":96,"componentType":5126,"count":2,"type":"MAT4"},
{"bufferView":0,"byteOffset":224,"componentType":5126,"count":2,"type":"SCALAR"},
{"bufferView":0,"byteOffset":232,"componentType":5126,"count":2,"type":"VEC4"},
{"bufferView":0,"byteOffset":264,"componentType":5126,"count":2,"type":"SCALAR"},
{"bufferView":0,"byteOffset":272,"componentType":5126,"count":3,"type":"VEC3"}],
"bufferViews":[{"buffer":0,"byteLength":308}],"buffers":[{"byteLength":308}]})";

Bytes rigBytes() {
    const float h = std::sqrt(0.5f);
    const float positions[] = {0, 0, 0, 1, 2, 0, 0, 4, 0};
    const uint8_t joints[] = {0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 0};
    const float weights[] = {1, 0, 0, 0, 1, 0, 0, 0, 0.5f, 0.5f, 0, 0};
    const float inverses[] = {1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 0, 0,  0, 1,
                              1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 0, -2, 0, 1};
    const float times[] = {0, 2}, turns[] = {0, 0, 0, 1, 0, 0, h, h}, lifts[] = {0, 1};
    const float differences[] = {0, 0, 1, 0, 0, 1, 0, 0, 1};
    Bytes bytes;
    append(bytes, positions, sizeof(positions));
    append(bytes, joints, sizeof(joints));
    append(bytes, weights, sizeof(weights));
    append(bytes, inverses, sizeof(inverses));
    append(bytes, times, sizeof(times));
    append(bytes, turns, sizeof(turns));
    append(bytes, lifts, sizeof(lifts));
    append(bytes, differences, sizeof(differences));
    return bytes;
}

TEST(GltfPose, MovesJointsAndTargets) {
    const GltfFile file = GltfFile::fromBinary(makeGlb(padded(rigJson), rigBytes()));
    EXPECT_TRUE(findFaults(file).empty());
    EXPECT_EQ(keyTimes(file), (std::vector<double>{0, 2}));
    const double h = std::sqrt(0.5);
    // The third vertex lies half way between where the two joints take it: (0, 4) and (0, 2) plus
    // two units along the turned axis.
    const std::pair<double, std::vector<Vector>> rows[] = {
        {-1, {{0, 0, 0}, {1, 2, 0}, {0, 4, 0}}},
        {1, {{0, 0, 0.5}, {h, 2 + h, 0.5}, {-h, 3 + h, 0.5}}},
        {2, {{0, 0, 1}, {0, 3, 1}, {-1, 3, 1}}},
        {7, {{0, 0, 1}, {0, 3, 1}, {-1, 3, 1}}}};
    for (const auto& [seconds, expected] : rows) {
        const GltfPose pose(file, seconds);
        const std::vector<Vector> drawn = pose.positions(pose.instances()[0], file.primitive(0, 0));
        ASSERT_EQ(drawn.size(), 3u);
        for (size_t v = 0; v < 3; ++v) {
            EXPECT_LT(length(drawn[v] - expected[v]), 1e-6) << "vertex " << v << " at " << seconds;
        }
    }
}

TEST(GltfPose, FaultsOfMovementAreFound) {
    const auto faultsOf = [](size_t offset, uint8_t value) {
        Bytes bytes = rigBytes();
        bytes.at(offset) = value;
        std::string kinds;
        for (const Fault& fault :
             findFaults(GltfFile::fromBinary(makeGlb(padded(rigJson), bytes)))) {
            kinds += fault.kind + " ";
        }
        return kinds;
    };
    EXPECT_EQ(faultsOf(40, 1), "");
    EXPECT_EQ(faultsOf(40, 2), "joints ");
    // The second time is 2.0f, 0x40000000: with other highest bytes 0.5, 0 and -0.
    EXPECT_EQ(faultsOf(231, 0x3F), "");
    EXPECT_EQ(faultsOf(231, 0), "key-times key-times ");
    EXPECT_EQ(faultsOf(231, 0x80), "key-times key-times ");
}

} // namespace
} // namespace test_support
