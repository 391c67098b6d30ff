#include "export_fixture.h"

#include "gltf/exporter.h"

#include <cmath>

using namespace test_support;
using scene::ILight;
using scene::light_schema;
using Light = GLTF::MaterialCommon::Light;

namespace {

/// Type, colour and fall-off: "2: 1 0.5 0 / 0 0 1 / 60", the angle in degrees.
std::string describe(const Light& light) {
    const auto& [red, green, blue, alpha] = light.color;
    EXPECT_EQ(alpha, 1);
    return base::format("{}: {} {} {} / {} {} {} / {}", static_cast<int>(light.type), red, green,
                        blue, light.constantAttenuation, light.linearAttenuation,
                        light.quadraticAttenuation, std::lround(light.fallOffAngle * 57.29578f));
}

} // namespace

TEST(Lights, BecomeRecordsWithTheirFallOff) {
    constexpr float inf = std::numeric_limits<float>::infinity();
    const char* const endless =
        "3 gltf |lamp| The light has values that are not finite, they are ignored.\n";
    const char* const rectangle =
        "3 lamp| GLTF doesn't support rectangle lights, will use spot instead\n";
    const struct {
        base::u8 type;
        float green, intensity, size, cone;
        const char *expected, *message = "";
    } rows[] = {{0, 0.5f, 4, 4, 60, "1: 4 2 4 / 0 0 0 / 180"},
                {1, 1, 1, 4, 60, "3: 1 1 1 / 1 0.5 0.0625 / 180"},
                {2, 1, 1, 0.1f, 60, "2: 1 1 1 / 1 20 100 / 60"},
                {3, 1, 1, 0, 60, "3: 1 1 1 / 0 0 1 / 90", rectangle},
                {4, 1, 1, 4, 60, "4: 1 1 1 / 0 0 0 / 180"},
                {2, inf, 7, -inf, NAN, "2: 7 7 7 / 1 20 100 / 90", endless},
                {1, 0.5f, NAN, 4, 60, "3: 1 0.5 1 / 1 0.5 0.0625 / 180", endless},
                {0, 1e30f, 1e30f, 4, 60, "1: 1 1 1 / 0 0 0 / 180", endless}};
    for (const auto& row : rows) {
        SCOPED_TRACE(&row - rows);
        Exporting scene;
        ILight& light = scene.add<ILight>("lamp");
        write(light, light_schema::n_lightType) = row.type;
        write(light, light_schema::n_color) = {1, row.green, 1};
        write(light, light_schema::n_intensity) = row.intensity;
        write(light, light_schema::n_size) = row.size;
        write(light, light_schema::n_spotConeAngle) = row.cone;
        const LogCapture log;
        const auto exporter = base::makeRef<gltf::GLTFScenePlugin>(nullptr, nullptr, 0);
        for (int time = 0; time < 2; ++time)
            EXPECT_EQ(describe(*exporter->convertLight(light)), row.expected);
        EXPECT_EQ(problems(log), row.message) << "once";
    }
}

TEST(Lights, SitOnTheNodeOrOnChildrenOfIt) {
    Exporting scene;
    auto& node = scene.addTo<scene::INode>(*scene.root, "n");
    write(node, scene::node_schema::n_translate) = {1, 2, 3};
    scene.addTo<ILight>(node);
    write(scene.addTo<ILight>(node), light_schema::n_intensity) = 1e-6f; // black
    scene.addTo<ILight>(node);
    scene.addTo<scene::ICamera>(node);
    const GltfFile file = scene.saveAndRead();
    EXPECT_FALSE(file.json().HasMember("cameras"));
    ASSERT_EQ(file.count("nodes"), 3u);
    const auto lightOf = [](const rapidjson::Value& json) {
        return json["extensions"]["KHR_materials_common"]["light"].GetInt();
    };
    const auto& holder = file.element("nodes", 1);
    EXPECT_TRUE(holder.HasMember("matrix"));
    EXPECT_EQ(lightOf(holder), 0);
    ASSERT_EQ(holder["children"].Size(), 1u);
    const auto& further = file.element("nodes", holder["children"][0].GetUint());
    EXPECT_EQ(lightOf(further), 1);
    EXPECT_EQ(further.MemberCount(), 1u) << "a transform";
}
