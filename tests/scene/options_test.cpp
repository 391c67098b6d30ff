#include "scene_options.h"

#include "log_capture.h"
#include "scene_schema.h"

#include "b_cmdline.h"
#include "b_exception.h"
#include "b_factory.h"

#include <gtest/gtest.h>

namespace {

using namespace scene;
using base::string;
using Strings = base::vector<string>;
using Exporter = sceneExporter_schema;
using Importer = sceneImporter_schema;

class Options : public testing::Test {
protected:
    Options() {
        register_scene_schema(factory_);
        register_importer_schema();
        register_exporter_schema();
        factory_.registerOptions(options_);
    }
    void give(const char* name, Strings tokens) {
        options_.find(name)->parse(name, tokens, errors_);
    }
    const base::CmdLineOption& option(const char* name) { return *options_.find(name); }

    base::PluginFactory factory_{"options"};
    base::CmdLineOptions options_;
    Strings errors_;
};

TEST_F(Options, OneForEachRow) {
    const base::map<string, string> expected{
        {"scene", " -upAxis 1"},
        {"exporter",
         " -exportEdges false -exportHair true -exportPoints true -exportColors true"
         " -exportTextureCoordinates true -exportTangents true -exportAnimations true"
         " -exportCameras true -exportLights true -exportBinary true -exportCompress true"
         " -exportCompressImages true -exportImageMaxDim 4096 -exportEmbedded true"},
        {"importer",
         " -keepInSync true -importMeshes true -importTriangulateMeshes false"
         " -importSurfaces true -importTriangulateSurfaces false -importSubdivision true"
         " -importTessellation 1 -importColors true -importMultiIndex always"
         " -importTextureCoordinates true -importNormals always -computeNormalsMethod smooth"
         " -flipNormals false -importTangents present -computeTangentsMethod standard"
         " -importVelocities true -importSkeletons true -importEdges true -importMaterials true"
         " -importLights true -importCameras true -importAnimations true"
         " -importBakedAnimations false -importHair true -importPoints true"}};
    base::map<string, string> found;
    for (const base::CmdLineGroup& group : options_.groups()) {
        for (const auto& option : group.options) {
            found[group.name] += " " + option->name + " " + option->defaultText;
            EXPECT_FALSE(option->helpText.empty()) << option->name;
        }
    }
    EXPECT_EQ(found, expected);

    const std::size_t importerOptions = options_.groups()[1].options.size();
    factory_.registerOptions(options_);
    EXPECT_EQ(options_.groups().size(), 3u);
    EXPECT_EQ(options_.groups()[1].options.size(), importerOptions) << "twice adds nothing";
}

TEST_F(Options, HelpTexts) {
    const struct {
        const char* name;
        const char* text;
    } cases[] = {
        {"-upAxis", "Set the up axis."},
        {"-exportTangents", "Whether to export the mesh tangents. If not present in the file, bump "
                            "and normal mapping may not work."},
        {"-exportEmbedded", "Incorporate into the file any external resources."},
        {"-importTriangulateMeshes",
         "Whether to triangulate the mesh or keep the original polygons. If not triangulated, this "
         "will be done on te fly which takes extra time. This should be not done for meshes which "
         "use subdivision/displacement however."},
        {"-importTessellation",
         "Modifier for the tessellation factor chosen for converting surfaces to triangles. Higher "
         "value will increase the quality, but will increase the processing time, file size and "
         "rendering speed."},
        {"-importTangents",
         "Whether to import the mesh tangents. If not present in the file, they must be generated "
         "on the fly or use the 'Without Tangents' bump space."},
    };
    for (const auto& c : cases)
        EXPECT_EQ(option(c.name).helpText, c.text);
    EXPECT_EQ(option("-importNormals").syntax, "never|present|always");
}

TEST_F(Options, GivenValuesBecomeAttributes) {
    base::AttribMap parameters;
    fillExporterDefaults(parameters);
    const base::u32 size = parameters.size();
    // A value of another type is replaced.
    parameters.attribute(Exporter::n_exportCompress, new base::TypedAttribute<string>("old"));
    give("-exportCompress", {"false"});
    give("-exportImageMaxDim", {"2048"});
    give("-exportEmbedded", {"maybe"});
    give("-upAxis", {"2"});
    give("-importNormals", {"never"});
    ASSERT_EQ(errors_.size(), 1u);
    EXPECT_EQ(errors_[0], "option '-exportEmbedded': type mismatch.");
    errors_.clear();

    applyOptions(options_, "exporter", parameters, errors_);
    EXPECT_FALSE(read(parameters, Exporter::n_exportCompress));
    EXPECT_EQ(read(parameters, Exporter::n_exportImageMaxDim), 2048u);
    EXPECT_TRUE(read(parameters, Exporter::n_exportEmbedded));
    EXPECT_EQ(parameters.size(), size) << "options of other groups, and those not given, stay out";

    base::AttribMap scene;
    applyOptions(options_, "scene", scene, errors_);
    EXPECT_EQ(read(scene, scene_schema::n_upAxis), 2);
    EXPECT_EQ(scene.size(), 1u);
    applyOptions(options_, "nobody", scene, errors_);
    EXPECT_EQ(scene.size(), 1u);
    EXPECT_TRUE(errors_.empty());
}

TEST_F(Options, WordsAndNumbersOfEnumerations) {
    const struct {
        const char* option;
        const char* text;
        int number; // -1: refused
    } cases[] = {
        {"-importNormals", "never", 0},
        {"-importNormals", "Present", 1},
        {"-importNormals", " always ", 2},
        {"-importNormals", "1", 1},
        {"-importNormals", "3", -1},
        {"-importNormals", "smooth", -1},
        {"-importNormals", "", -1},
        {"-importNormals", "-1", -1},
        {"-computeNormalsMethod", "flat", 1},
        {"-computeNormalsMethod", "2", -1},
        {"-computeTangentsMethod", "standard", 0},
        {"-importMultiIndex", "never", 0},
        {"-importTangents", "0", 0},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(string(c.option) + " " + c.text);
        base::CmdLineOptions options;
        registerImporterOptions(options);
        errors_.clear();
        options.find(c.option)->parse(c.option, {c.text}, errors_);
        base::AttribMap parameters;
        applyOptions(options, "importer", parameters, errors_);
        const auto* value = parameters.findAttribute<base::u8>(base::nameServer().id(c.option + 1));
        EXPECT_EQ(value ? *value : -1, c.number);
        EXPECT_EQ(errors_.size(), c.number < 0 ? 1u : 0u);
    }
    // The message of a refused word names option and choice.
    give("-importNormals", {"often"});
    base::AttribMap parameters;
    errors_.clear();
    applyOptions(options_, "importer", parameters, errors_);
    EXPECT_EQ(errors_, (Strings{"option '-importNormals': type mismatch.\n"
                                " syntax: -importNormals never|present|always\n"}));
}

TEST_F(Options, ExporterDefaults) {
    base::AttribMap parameters;
    fillExporterDefaults(parameters);
    EXPECT_EQ(parameters.typeName().view(), "sceneExporter");
    EXPECT_EQ(parameters.size(), 14u);
    EXPECT_EQ(parameters.findAttribute(Exporter::n_exportBinary), nullptr);
    EXPECT_EQ(parameters.findAttribute(Exporter::n_resourcePaths), nullptr);
    for (const auto* on :
         {&Exporter::n_exportHair, &Exporter::n_exportPoints, &Exporter::n_exportColors,
          &Exporter::n_exportTextureCoordinates, &Exporter::n_exportTangents,
          &Exporter::n_exportAnimations, &Exporter::n_exportCameras, &Exporter::n_exportLights,
          &Exporter::n_exportCompress, &Exporter::n_exportCompressImages,
          &Exporter::n_exportEmbedded}) {
        const bool* value = find(parameters, *on);
        EXPECT_TRUE(value && *value) << on->text;
    }
    EXPECT_FALSE(*find(parameters, Exporter::n_exportEdges));
    EXPECT_EQ(*find(parameters, Exporter::n_exportImageMaxDim), 4096u);
    EXPECT_EQ(*find(parameters, Exporter::n_exportCopyright), "");

    // What was set is set back; a wrong type is the caller's fault.
    write(parameters, Exporter::n_exportImageMaxDim) = 5;
    fillExporterDefaults(parameters);
    EXPECT_EQ(*find(parameters, Exporter::n_exportImageMaxDim), 4096u);
    parameters.attribute(Exporter::n_exportHair, new base::TypedAttribute<base::i32>(1));
    EXPECT_THROW(fillExporterDefaults(parameters), base::exception);
}

TEST_F(Options, ImporterDefaults) {
    base::AttribMap parameters;
    fillImporterDefaults(parameters);
    EXPECT_EQ(parameters.typeName().view(), "sceneImporter");
    EXPECT_EQ(parameters.size(), 32u);
    EXPECT_EQ(*find(parameters, Importer::n_importMultiIndex), 2);
    EXPECT_EQ(*find(parameters, Importer::n_importNormals), 2);
    EXPECT_EQ(*find(parameters, Importer::n_importTangents), 1);
    EXPECT_EQ(*find(parameters, Importer::n_computeNormalsMethod), 0);
    EXPECT_EQ(*find(parameters, Importer::n_computeNormalsAngle), 60.0f);
    EXPECT_EQ(*find(parameters, Importer::n_importTessellation), 1.0f);
    EXPECT_EQ(*find(parameters, Importer::n_hashMethod), "xx");
    EXPECT_EQ(*find(parameters, Importer::n_compressionMethod), "zip");
    EXPECT_EQ(*find(parameters, Importer::n_compressionLevel), 5);
    EXPECT_EQ(*find(parameters, Importer::n_textColumns), 180);
    EXPECT_EQ(find(parameters, Importer::n_modificationDate), nullptr);
}

TEST_F(Options, ExportersTakeTheirAttributes) {
    base::AttribMap object;
    write(object, Exporter::n_exportCompress) = false;
    write(object, Exporter::n_exportBinary) = false;
    write(object, Exporter::n_exportCopyright) = "us";
    write(object, Exporter::n_resourcePaths) = {"a", "b"};
    Exporter settings;
    settings.exportHair = false; // of an earlier use
    settings.bindSettings(object);
    EXPECT_FALSE(settings.exportCompress);
    EXPECT_TRUE(settings.exportBinary) << "never read";
    EXPECT_EQ(settings.exportCopyright, "us");
    EXPECT_EQ(settings.resourcePaths, (Strings{"a", "b"}));
    EXPECT_TRUE(settings.exportHair);
    EXPECT_EQ(settings.exportImageMaxDim, 4096u);
    // What was missing is there now.
    EXPECT_EQ(*find(object, Exporter::n_exportImageMaxDim), 4096u);
    EXPECT_TRUE(*find(object, Exporter::n_exportHair));
    EXPECT_EQ(object.size(), 16u);

    base::AttribMap bare;
    settings.bindSettings(bare);
    EXPECT_TRUE(settings.resourcePaths.empty());
    EXPECT_EQ(bare.size(), 14u) << "neither exportBinary nor resourcePaths is made";

    base::AttribMap wrong;
    write(wrong, Exporter::n_exportCopyright) = "x";
    wrong.attribute(Exporter::n_exportEmbedded, new base::TypedAttribute<string>("yes"));
    EXPECT_THROW(settings.bindSettings(wrong), base::exception);
}

} // namespace
