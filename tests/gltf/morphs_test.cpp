#include "animated_fixture.h"

using namespace test_support;
using scene::IMesh;
using scene::IMorph;
using scene::morph_schema;
using scene::morphTarget_schema;
using Values = std::vector<double>;

namespace {

/// A node "n" with a morph of the triangle "base".
struct MorphScene : AnimatedScene {
    MorphScene() { setBase(morph); }
    void setBase(IMorph& object) { write(object, morph_schema::n_baseMesh) = scene::Object(&base); }
    /// A target that moves all vertices by `z`.
    base::AttribMap& addTarget(IMorph& object, float z, float weight, size_t vertices = 3) {
        auto& mesh = add<IMesh>("target");
        write(mesh, scene::mesh_schema::n_positions).resize(vertices, base::vec3f{0, 0, z});
        base::AttribMap& target = appendItem(object, morph_schema::n_targets);
        write(target, morphTarget_schema::n_targetMesh) = scene::Object(&mesh);
        write(target, morphTarget_schema::n_weight) = weight;
        return target;
    }

    scene::INode& node = addTo<scene::INode>(*root, "n");
    IMorph& morph = addTo<IMorph>(node, "morph");
    IMesh& base = makeTriangle(add<IMesh>("base"));
};

/// The z of the targets of a mesh, their weights behind a slash.
std::string describe(const GltfFile& file, size_t mesh) {
    std::string text = file.element("meshes", mesh)["name"].GetString();
    for (const auto& target : file.primitive(mesh, 0).targets)
        text += base::format(" {}", target.at("POSITION").at(0)[2]);
    text += " /";
    if (file.element("meshes", mesh).HasMember("weights"))
        for (const auto& weight : file.element("meshes", mesh)["weights"].GetArray())
            text += base::format(" {}", weight.GetDouble());
    return text;
}

constexpr const char* weightText =
    "3 gltf |morph| The morph has weights that are not finite, they count as 0!\n";

} // namespace

TEST(Morphs, GiveTheirMeshTargetsAndWeights) {
    struct Row {
        const char* name;
        std::function<void(MorphScene&)> build;
        const char* mesh;
        const char* message = "";
    } const rows[] = {
        {"only what has a mesh that fits counts",
         [](MorphScene& s) {
             s.addTarget(s.morph, 1, 0.25f);
             s.addTarget(s.morph, 2, 0.5f).removeAttribute(morphTarget_schema::n_targetMesh);
             write(s.morph, morph_schema::n_targets).append(nullptr);
             s.addTarget(s.morph, 3, 0).removeAttribute(morphTarget_schema::n_weight);
             s.addTarget(s.morph, 4, 1, 2);
         },
         "base 1 3 / 0.25 0",
         "2 gltf |target| Wrong number of elements in 'positions', the data is left out! Expected "
         "3 elements, found 2.\n"},
        {"without targets by its flag",
         [](MorphScene& s) {
             s.addTarget(s.morph, 1, 1);
             s.morph.setFlags(s.morph.flags() | 1u << 11);
         },
         "base /"},
        {"weights of double precision, and not finite",
         [](MorphScene& s) {
             for (const double weight : {0.5, 1e300, double(NAN)}) {
                 base::AttribMap& target = s.addTarget(s.morph, 1, 0);
                 target.removeAttribute(morphTarget_schema::n_weight);
                 target.attribute<double>(morphTarget_schema::n_weight) = weight;
             }
         },
         "base 1 1 1 / 0.5 0 0", weightText},
        {"the same morph, of whole shapes, twice",
         [](MorphScene& s) {
             write(s.morph, morph_schema::n_method) = 1;
             for (auto& position : write(s.base, scene::mesh_schema::n_positions))
                 position.z = 10;
             s.addTarget(s.morph, 11, 0.5f);
             s.append(*s.root, s.morph);
         },
         "base 1 / 0.5"},
        {"two morphs on one base",
         [](MorphScene& s) {
             s.addTarget(s.morph, 1, 0.5f);
             IMorph& second = s.addTo<IMorph>(*s.root, "second");
             s.setBase(second);
             s.addTarget(second, 2, 0.25f);
         },
         "base 1 2 / 0.5 0.25",
         "3 gltf |second| The mesh has the targets of another morph already, these are added to "
         "them!\n"}};
    for (const Row& row : rows) {
        SCOPED_TRACE(row.name);
        MorphScene scene;
        row.build(scene);
        const LogCapture log;
        const GltfFile file = scene.saveAndRead();
        ASSERT_EQ(file.count("meshes"), 1u);
        EXPECT_EQ(describe(file, 0), row.mesh);
        EXPECT_EQ(problems(log), row.message);
        EXPECT_FALSE(file.json().HasMember("animations"));
        EXPECT_TRUE(findFaults(file).empty());
    }
}

TEST(Morphs, WithoutAnimationsAreTheShapeOfTheMoment) {
    for (const bool hasShape : {true, false}) {
        MorphScene scene;
        scene.set(Exporting::Settings::n_exportAnimations, false);
        scene.animate<float>(scene.addTarget(scene.morph, 1, 0), morphTarget_schema::n_weight,
                             {0, 1}, {0.5f, 1});
        if (hasShape)
            write(scene.morph, morph_schema::n_outMesh) =
                scene::Object(&makeTriangle(scene.add<IMesh>("shape")));
        const GltfFile file = scene.saveAndRead();
        ASSERT_EQ(file.count("meshes"), 1u);
        EXPECT_EQ(describe(file, 0), hasShape ? "shape /" : "base 1 / 0.5");
        EXPECT_FALSE(file.json().HasMember("animations"));
    }
}

TEST(Morphs, SampleAllWeightsFrameByFrame) {
    MorphScene scene;
    write(*scene.scene, scene::scene_schema::n_framesPerSecond) = 2;
    scene.addTarget(scene.morph, 1, 0.25f);
    scene.addTarget(scene.morph, 2, 0).removeAttribute(morphTarget_schema::n_targetMesh);
    scene.animate<double>(scene.addTarget(scene.morph, 3, 0), morphTarget_schema::n_weight, {0, 2},
                          {0, 1});
    scene.animate<float>(scene.addTarget(scene.morph, 4, 0), morphTarget_schema::n_weight, {1, 2},
                         {0.5f, NAN});
    // One place more, with samples of its own.
    scene.append(scene.addTo<scene::INode>(*scene.root, "again"), scene.morph);
    const LogCapture log;
    const GltfFile file = scene.saveAndRead();
    EXPECT_EQ(problems(log), weightText);
    auto samples = readSamples(file);
    ASSERT_EQ(samples.size(), 2u);
    for (const char* name : {"n weights", "again weights"}) {
        SCOPED_TRACE(name);
        EXPECT_EQ(samples[name].times, (Values{0, 0.5, 1, 1.5}));
        EXPECT_EQ(samples[name].values.values, (Values{0.25, 0, 0.5, 0.25, 0.25, 0.5, //
                                                       0.25, 0.5, 0.5, 0.25, 0.75, 0}));
    }
    EXPECT_EQ(samples["n weights"].input, samples["again weights"].input);
    EXPECT_TRUE(findFaults(file).empty());
}
