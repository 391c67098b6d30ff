#include "b_attribute_desc.h"

#include "b_exception.h"
#include "b_factory.h"
#include "log_capture.h"
#include "stream/b_fs.h"
#include "temp_folder.h"

#include <gtest/gtest.h>
#include <thread>

namespace base {
namespace {

using namespace test_support;

name_id named(string_view text) {
    return nameServer().id(text);
}

/// The content of a file with these maps.
string document(const string& maps) {
    return "<?xml version=\"1.0\"?>\n<Document>" + maps + "</Document>";
}

/// A manager with one map "m" of one attribute "x", which has these XML attributes.
struct OneAttribute {
    explicit OneAttribute(const string& xmlAttributes) {
        manager.loadText(document("<AttributeMap name='m'><Attribute name='x' " + xmlAttributes +
                                  "/></AttributeMap>"),
                         "one.xml");
        desc = manager.find(named("m"))->find(named("x"));
    }
    AttribDescManager manager;
    ref<const AttribDesc> desc;
};

class AttribDescTest : public testing::Test {
protected:
    void add(const string& maps) { manager.loadText(document(maps), "test.xml"); }
    string write(const string& name, string_view text) {
        fs::writeFile(folder / name, text.data(), text.size());
        return folder / name;
    }
    string derivedFrom(string_view type) {
        set<string> sorted;
        for (const name_id name : manager.derived(named(type)))
            sorted.insert(name.text());
        string text;
        for (const string& name : sorted)
            text += name + " ";
        return text;
    }

    AttribDescManager manager;
    TempFolder folder;
    LogCapture log;
};

TEST_F(AttribDescTest, ReadsAllThatAFileSays) {
    manager.load(write("all.xml", R"(<?xml version="1.0" encoding="UTF-8"?>
<Document namespace="things" destination="out" constructor="make">
  <AttributeMap name="lamp" friend="shade" inherit="thing" class="Lamp" label="A lamp" help="1 &amp;lt; 2"
                abstract="yes" copyright="ours" flags="singleInstance customDescriptor" unknown="?">
    <Attribute name="power" label="Power" type="float" control="slider" initialisator="init"
               action="act" default="5" min="0" max="9" soft_min="1" soft_max="8" enum="a;b"
               help="of&#10;it" units="W" precision=" 3 " control-lines="2" unknown="?"/>
    <Other name="ignored"/>
    <Attribute name="points" type="arrayof" of="vec3f" label="Points" help="many"/>
  </AttributeMap>
  <Other><AttributeMap name="nested"/></Other>
</Document>)"));
    EXPECT_EQ(manager.fileAttributes().nameSpace, "things");
    EXPECT_EQ(manager.fileAttributes().destination, "out");
    EXPECT_EQ(manager.fileAttributes().constructor, "make");

    const AttribMapDesc* lamp = manager.find(named("lamp"));
    ASSERT_TRUE(lamp);
    EXPECT_EQ(lamp->name, named("lamp"));
    EXPECT_EQ(lamp->friendName, named("shade"));
    EXPECT_EQ(lamp->inherit, named("thing"));
    EXPECT_EQ(lamp->className, named("Lamp"));
    EXPECT_EQ(lamp->label + "|" + lamp->help + "|" + lamp->copyright, "A lamp|1 < 2|ours");
    EXPECT_TRUE(lamp->isAbstract);
    EXPECT_EQ(lamp->flags, 3u);

    ASSERT_EQ(lamp->attributes.size(), 2u);
    const AttribDesc& power = *lamp->attributes[0];
    EXPECT_EQ(power.name, named("power"));
    EXPECT_EQ(power.typeName, named("float"));
    EXPECT_EQ(power.elementType, name_id());
    EXPECT_EQ(power.control, named("slider"));
    string texts;
    for (const string& text :
         {power.label, power.type, power.initialisator, power.action, power.defaultValue, power.min,
          power.max, power.softMin, power.softMax, power.enumeration, power.help, power.units})
        texts += text + "|";
    EXPECT_EQ(texts, "Power|float|init|act|5|0|9|1|8|a;b|of\nit|W|");
    EXPECT_EQ(power.precision, 3u);
    EXPECT_EQ(power.controlLines, 2u);
    EXPECT_EQ(power.flags, 0u);
    const AttribDesc& points = *lamp->attributes[1];
    EXPECT_EQ(points.typeName, named("arrayof"));
    EXPECT_EQ(points.elementType, named("vec3f"));
    EXPECT_EQ(points.label + points.help, "Pointsmany");

    EXPECT_EQ(manager.find(named("nested")), nullptr);
    EXPECT_EQ(manager.find(named("unheard of")), nullptr);
    EXPECT_EQ(manager.find({}), nullptr);
    EXPECT_EQ(problems(log), "");
}

TEST_F(AttribDescTest, TextsAndSwitchesFollowTheirRules) {
    const struct {
        const char* inFile;
        const char* help;
    } helps[] = {{"a &amp;lt;b&amp;gt; &amp;amp; c", "a <b> & c"},
                 {"&lt;b>", "<b>"},
                 {"&amp;amp;lt;", "&lt;"}, // nothing decodes twice
                 {"&amp;quot; &amp;lt", "&quot; &lt"},
                 {"", ""}};
    for (const auto& row : helps)
        EXPECT_EQ(OneAttribute(format("help=\"{}\"", row.inFile)).desc->help, row.help);

    const struct {
        const char* key;
        u32 bit;
    } switches[] = {{"visible", 1},  {"resource", 2}, {"optional", 4}, {"read-only", 8},
                    {"cmdline", 16}, {"state", 32},   {"keyable", 64}};
    for (const auto& row : switches) {
        for (const char* on : {"1", "true", "yes", "TRUE"})
            EXPECT_EQ(OneAttribute(format("{}='{}'", row.key, on)).desc->flags, row.bit) << row.key;
        for (const char* off : {"0", "false", "no", "on", "2", ""})
            EXPECT_EQ(OneAttribute(format("{}='{}'", row.key, off)).desc->flags, 0u) << row.key;
    }

    const OneAttribute turn("type='quat'"), turns("type='arrayof' of='quat'");
    EXPECT_EQ(turn.desc->type, "quatf");
    EXPECT_EQ(turn.desc->typeName, named("quatf"));
    EXPECT_EQ(turns.desc->elementType, named("quatf"));

    add("<AttributeMap name='f0' flags='singleinstance'/>"
        "<AttributeMap name='f1' flags='a,singleInstance;'/>"
        "<AttributeMap name='f2' flags='customDescriptor'/>");
    for (u32 flags = 0; flags < 3; ++flags)
        EXPECT_EQ(manager.find(named(format("f{}", flags)))->flags, flags);
    EXPECT_EQ(problems(log), "");
}

TEST_F(AttribDescTest, BadNumbersCountAsZeroAndAreTold) {
    for (const char* value : {"many", "", "-1", "1.5", "4294967296", "+1"}) {
        log.take();
        EXPECT_EQ(OneAttribute(format("precision='{}'", value)).desc->precision, 0u) << value;
        EXPECT_EQ(problems(log),
                  format("3 attribute descriptions| The precision '{}' of attribute 'x' in map 'm' "
                         "of file one.xml is no number and counts as 0\n",
                         value));
    }
    EXPECT_EQ(OneAttribute("precision='4294967295'").desc->precision, 4294967295u);
}

TEST_F(AttribDescTest, TheFirstDescriptionKeepsAName) {
    const string first =
        write("a.xml", "<Document namespace='a'><AttributeMap name='same' label='first'/>"
                       "<AttributeMap name='same' label='second'/></Document>");
    const string second =
        write("b.xml", "<Document destination='b'><AttributeMap name='same' label='third'/>"
                       "<AttributeMap name='other'/><AttributeMap/></Document>");
    write("c.txt", "no XML");
    manager.loadDirectory(folder.path());
    EXPECT_EQ(manager.find(named("same"))->label, "first");
    EXPECT_TRUE(manager.find(named("other")));
    EXPECT_EQ(manager.fileAttributes().nameSpace, "");
    EXPECT_EQ(manager.fileAttributes().destination, "b");
    EXPECT_EQ(problems(log),
              format("2 Duplicated property map name 'same' in file {}!\n"
                     "3 attribute descriptions| Skipped a map without a name in file {}\n"
                     "2 Duplicated property map name 'same' in file {}!\n",
                     first, second, second));
}

TEST_F(AttribDescTest, WhatIsNoFileOfXmlThrowsAndChangesNothing) {
    add("<AttributeMap name='known'/>");
    const struct {
        const char* text;
        const char* message; ///< the parser's
    } table[] = {
        {"", "No document element found"},
        {"text", "No document element found"},
        {"<Document><AttributeMap name='lost'/>", "Start-end tags mismatch"},
        {"<Document><AttributeMap name='lost></Document>", "Error parsing element attribute"},
    };
    for (const auto& row : table) {
        const string path = write("bad.xml", row.text);
        try {
            manager.load(path);
            ADD_FAILURE() << row.text;
        } catch (const exception& error) {
            EXPECT_STREQ(error.what(), row.message);
            EXPECT_STREQ(error.function(), "base::AttribDescManager::load");
        }
        EXPECT_NE(problems(log).find("2 attribute descriptions| Unable to parse file " + path),
                  string::npos);
        EXPECT_EQ(manager.find(named("lost")), nullptr);
    }
    EXPECT_THROW(manager.load(folder / "none.xml"), fs::file_not_found);
    EXPECT_THROW(manager.load(folder.path()), exception);
    // One byte more than is allowed, without the bytes.
    std::filesystem::resize_file(write("huge.xml", "<Document/>"), (64u << 20) + 1);
    EXPECT_THROW(manager.load(folder / "huge.xml"), exception);
    EXPECT_TRUE(manager.find(named("known")));
}

TEST_F(AttribDescTest, AttributesComeFromTheNearestInTheChain) {
    add(R"(<AttributeMap name='base'><Attribute name='x' label='1' control='dial'/>
             <Attribute name='y' label='2' type='float'/></AttributeMap>
           <AttributeMap name='middle' inherit='base'><Attribute name='x' label='3' type='color'/>
             <Attribute name='x' label='4'/><Attribute label='nameless'/></AttributeMap>
           <AttributeMap name='leaf' inherit='middle'/>
           <AttributeMap name='lost' inherit='not described'/>)");
    const struct {
        const char* type;
        const char* attribute;
        const char* label;
        const char* control;
    } table[] = {{"base", "x", "1", "dial"},  {"base", "y", "2", "float"},
                 {"leaf", "x", "3", "color"}, {"leaf", "y", "2", "float"},
                 {"leaf", "z", "none", ""},   {"lost", "x", "none", ""}};
    for (const auto& row : table) {
        const AttribMapDesc& desc = *manager.find(named(row.type));
        const ref<const AttribDesc> found = desc.find(named(row.attribute));
        EXPECT_EQ(found ? found->label : "none", row.label) << row.type << row.attribute;
        EXPECT_STREQ(desc.control(named(row.attribute)).text(), row.control)
            << row.type << row.attribute;
    }
    EXPECT_EQ(manager.find(named("middle"))->attributes.size(), 3u);
}

TEST_F(AttribDescTest, ChainsEndAfter64StepsAndMayBeRings) {
    string maps = "<AttributeMap name='t0'><Attribute name='far'/></AttributeMap>";
    for (int i = 1; i <= 65; ++i)
        maps += format("<AttributeMap name='t{}' inherit='t{}'/>", i, i - 1);
    maps += "<AttributeMap name='r' inherit='s'/><AttributeMap name='s' inherit='r'/>"
            "<AttributeMap name='self' inherit='self'/>";
    add(maps);
    for (const auto& [type, isNear] : {std::pair("t64", true), std::pair("t65", false)}) {
        EXPECT_EQ(bool(manager.find(named(type))->find(named("far"))), isNear) << type;
        EXPECT_EQ(manager.derivesFrom(named(type), named("t0")), isNear) << type;
    }
    EXPECT_EQ(manager.derived(named("t0")).size(), 64u);
    EXPECT_EQ(manager.find(named("r"))->find(named("far")), nullptr);
    EXPECT_EQ(derivedFrom("r") + derivedFrom("s") + derivedFrom("self"), "s r ");
    EXPECT_FALSE(manager.derivesFrom(named("r"), named("t0")));
}

TEST_F(AttribDescTest, FilesAndClassesOfTheCodeTellOfTypesTogether) {
    manager.addClass(named("fileImage"), named("image"));
    EXPECT_EQ(derivedFrom("image"), "");
    // Describing a class of the code takes nothing from what the code says.
    add("<AttributeMap name='woodImage' inherit='fileImage'/><AttributeMap name='fileImage'/>"
        "<AttributeMap name='image' inherit='resource'/>");
    EXPECT_EQ(derivedFrom("image"), "");
    EXPECT_EQ(derivedFrom("fileImage"), "woodImage ");
    EXPECT_EQ(derivedFrom("resource"), "image ");
    EXPECT_EQ(derivedFrom(""), "");
    for (const char* base : {"woodImage", "fileImage", "image", "resource"})
        EXPECT_TRUE(manager.derivesFrom(named("woodImage"), named(base))) << base;
    EXPECT_FALSE(manager.derivesFrom(named("image"), named("fileImage")));
    EXPECT_FALSE(manager.derivesFrom(named("woodImage"), {}));
}

/// The factory asks the manager of the process, so these names are of this test alone.
TEST_F(AttribDescTest, FactoriesFindDerivedTypesByTheFiles) {
    const auto factory = makeRef<PluginFactory>("doc");
    for (const char* type : {"found.child", "found.base"})
        factory->create(named(type));
    EXPECT_EQ(factory->findByType(named("found.base")), 1);
    EXPECT_EQ(factory->findByType(named("found.root")), -1);
    attribDescManager().loadText(document("<AttributeMap name='found.child' inherit='found.base'/>"
                                          "<AttributeMap name='found.base' inherit='found.root'/>"),
                                 "found.xml");
    EXPECT_EQ(factory->findByType(named("found.base")), 0);
    EXPECT_EQ(factory->findByType(named("found.root")), 0);
    EXPECT_EQ(factory->findByType(named("found.child")), 0);
    EXPECT_EQ(factory->firstOfType(named("found.base"))->id(), 1u);
    factory->remove(0, false);
    EXPECT_EQ(factory->findByType(named("found.root")), 1);
}

TEST_F(AttribDescTest, MayBeLoadedAndAskedOnThreads) {
    constexpr u32 threadCount = 4, fileCount = 50;
    std::atomic<u32> found = 0;
    const auto loadAndAsk = [&] {
        for (u32 i = 0; i < fileCount; ++i) {
            const string name = format("shared{}", i);
            add(format("<AttributeMap name='{}' inherit='base'/>", name));
            found += manager.find(named(name)) && manager.derivesFrom(named(name), named("base"));
        }
    };
    {
        std::vector<std::jthread> threads;
        for (u32 i = 0; i < threadCount; ++i)
            threads.emplace_back(loadAndAsk);
    }
    EXPECT_EQ(found, threadCount * fileCount);
    EXPECT_EQ(manager.derived(named("base")).size(), fileCount);
    EXPECT_EQ(log.entries().size(), (threadCount - 1) * fileCount); // all but the first ones
}

} // namespace
} // namespace base
