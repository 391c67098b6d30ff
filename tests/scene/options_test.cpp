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

    base::PluginFactory factory_{"options"};
    base::CmdLineOptions options_;
    Strings errors_;
};

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
    struct Case {
        const char *option, *text;
        int number; // -1: refused
    };
    const Case cases[] = {{"-importNormals", "never", 0},
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
                          {"-importTangents", "0", 0}};
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

TEST_F(Options, DefaultsReplaceWhatWasSet) {
    base::AttribMap parameters;
    fillImporterDefaults(parameters);
    EXPECT_EQ(parameters.size(), 32u);
    parameters.clear();
    write(parameters, Exporter::n_exportImageMaxDim) = 5;
    fillExporterDefaults(parameters);
    EXPECT_EQ(*find(parameters, Exporter::n_exportImageMaxDim), 4096u);
    EXPECT_EQ(parameters.size(), 14u) << "neither exportBinary nor resourcePaths";
    parameters.attribute(Exporter::n_exportHair, new base::TypedAttribute<base::i32>(1));
    EXPECT_THROW(fillExporterDefaults(parameters), base::exception);
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
    // What was missing is there now.
    EXPECT_EQ(*find(object, Exporter::n_exportImageMaxDim), 4096u);
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
