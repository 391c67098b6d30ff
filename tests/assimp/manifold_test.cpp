#include "gltf_faults.h"
#include "import_fixture.h"

#include "gltf/plugin_desc.h"

#include <array>

namespace {

using namespace scene;
using namespace base;

/// A surface that touches itself.
struct Case {
    const char* what;
    struct {
        std::size_t vertices, triangles;
    } written;
    vector<std::array<float, 3>> positions;
    vector<vector<u32>> faces; ///< numbers of positions
};

const Case cases[] = {
    {"two cones with one tip",
     {8, 6},
     {{0, 0, 0}, {1, 0, 1}, {0, 1, 1}, {-1, -1, 1}, {1, 0, -1}, {0, 1, -1}, {-1, -1, -1}},
     {{0, 1, 2}, {0, 2, 3}, {0, 3, 1}, {0, 5, 4}, {0, 6, 5}, {0, 4, 6}}},
    {"squares that meet in a corner",
     {8, 4},
     {{0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0, 1, 0}, {2, 1, 0}, {2, 2, 0}, {1, 2, 0}},
     {{0, 1, 2, 3}, {2, 4, 5, 6}}},
    // Two of them are connected.
    {"three faces at one edge",
     {7, 3},
     {{0, 0, 0}, {1, 0, 0}, {0, 1, 0}, {0, -1, 1}, {0, -1, -1}},
     {{0, 1, 2}, {1, 0, 3}, {0, 1, 4}}},
    {"flipped neighbour",
     {8, 4},
     {{0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0, 1, 0}, {2, 0, 0}, {2, 1, 0}},
     {{0, 1, 2, 3}, {1, 2, 5, 4}}},
    {"one face three times, once mirrored",
     {9, 3},
     {{0, 0, 0}, {1, 0, 0}, {0, 1, 0}},
     {{0, 1, 2}, {0, 1, 2}, {2, 1, 0}}},
    // Its third square has the first side of the first one in the same direction.
    {"Moebius strip",
     {8, 6},
     {{2, 0, -1}, {2, 0, 1}, {-1, 2, -1}, {-1, 2, 1}, {-1, -2, -1}, {-1, -2, 1}},
     {{0, 2, 3, 1}, {2, 4, 5, 3}, {4, 1, 0, 5}}},
    // The faces around position 0 pass position 1 twice, and those around 1 pass 0 twice.
    {"fold in an edge",
     {9, 7},
     {{0, 0, 0}, {0, 0, 1}, {1, 0, 0}, {1, 1, 0}, {-1, 1, 0}, {-1, 0, 0}},
     {{0, 1, 2}, {0, 5, 1}, {0, 3, 1}, {0, 1, 4}, {0, 2, 3}, {0, 4, 5}, {1, 3, 2}}},
    // The rhombus is cut from 0 to 2, where a face of the pocket around it has an edge.
    {"diagonal in an edge",
     {8, 5},
     {{0, 0, 0}, {2, 0.5f, 0}, {0, 1, 0}, {-2, 0.5f, 0}, {0.5f, 0.5f, 1}},
     {{0, 1, 2, 3}, {0, 2, 4}, {1, 0, 4}, {2, 1, 4}}},
    {"fin on a diagonal",
     {8, 4},
     {{0, 0, 0}, {2, 0.5f, 0}, {0, 1, 0}, {-2, 0.5f, 0}, {0, 0, 1}, {1, -1, 0}},
     {{0, 2, 4}, {0, 1, 2, 3}, {1, 0, 5}}},
    // Position 3 is the end of a spike without area.
    {"corner without a triangle",
     {4, 2},
     {{0, 0, 0}, {2, 0, 0}, {2, 2, 0}, {2, 3, 0}, {0, 2, 0}},
     {{0, 1, 2, 3, 2, 4}}}};

/// In OBJ, with `suffix` at each corner; without one in OFF, where faces share vertices.
std::string textOf(const Case& c, const char* suffix) {
    std::string text =
        suffix ? "vt 0 0\n" : base::format("OFF\n{} {} 0\n", c.positions.size(), c.faces.size());
    for (const auto& [x, y, z] : c.positions)
        text += base::format("{}{} {} {}\n", suffix ? "v " : "", x, y, z);
    for (const vector<u32>& face : c.faces) {
        text += suffix ? "f" : base::format("{}", face.size());
        for (const u32 corner : face)
            text +=
                suffix ? base::format(" {}{}", corner + 1, suffix) : base::format(" {}", corner);
        text += "\n";
    }
    return text;
}

class Manifold : public test_support::Import {
protected:
    void expectCounts(const Case& c, const char* name, const char* suffix) {
        SCOPED_TRACE(base::format("{} {}", c.what, name));
        ASSERT_TRUE(load(name, textOf(c, suffix)));
        gltf::registerPlugin(*document_);
        const base::string path = (folder_ / "out.glb").string();
        ASSERT_TRUE(document_->save(*document_, path, base::AttribMap()));
        const auto file = test_support::GltfFile::read(path);
        for (const test_support::Fault& fault : findFaults(file))
            ADD_FAILURE() << fault.kind << ' ' << fault.text;
        const test_support::Primitive primitive = file.primitive(0, 0);
        EXPECT_TRUE(primitive.compressed);
        EXPECT_EQ(primitive.attributes.at("POSITION").count, c.written.vertices);
        EXPECT_EQ(primitive.triangles().size(), c.written.triangles);
    }
    void expectCounts(const Case& c) {
        set(Settings::n_importNormals, Presence::never);
        expectCounts(c, "shared.off", nullptr);
        expectCounts(c, "positions.obj", "");
        for (const Presence presence : {Presence::never, Presence::always}) {
            set(Settings::n_importMultiIndex, presence);
            expectCounts(c, "uvs.obj", "/1");
        }
    }
};

/// The encoder must find nothing to split, drop or join: its streams have the declared counts.
TEST_F(Manifold, CompressionKeepsTheCounts) {
    for (const Case& c : cases)
        expectCounts(c);

    Case fins{"very many faces at one edge", {60, 20}, {{0, 0, 0}, {0, 0, 1}}, {}};
    for (u32 i = 2; i < 22; ++i) {
        fins.positions.push_back({1, static_cast<float>(i), 0});
        fins.faces.push_back({i % 2, 1 - i % 2, i});
    }
    expectCounts(fins);
}

} // namespace
