#include "b_attribute_binary.h"
#include "b_exception.h"

#include "allocation_size.h"
#include "binary_stream.h"
#include "every_value.h"
#include "log_capture.h"

#include <gtest/gtest.h>

using namespace base;
using namespace test_support;

namespace {

name_id named(string_view text) {
    return nameServer().id(text);
}

enum class Source { view, checkedView, pipe };

/// What came of reading: "true", "false" or what was thrown.
string outcomeOf(Bytes bytes, Source source, PluginFactory& factory) {
    Stream stream =
        source == Source::pipe ? pipeOf(bytes) : viewOf(bytes, source == Source::checkedView);
    try {
        return factory.read(stream) ? "true" : "false";
    } catch (const exception& error) {
        return error.what();
    }
}

string outcomeOf(const ByteList& file) {
    PluginFactory factory;
    return outcomeOf(file.bytes(), Source::checkedView, factory);
}

/// A document without a table of names: everything before the attributes of its own.
ByteList head(std::initializer_list<const char*> types = {}) {
    ByteList file;
    file.raw("BPF1").u32(1).u32(0).u32(1).u32(0).u32(types.size());
    for (const char* type : types)
        file.text(type);
    return file.text(""); // no own type of the document's attributes
}

/// The same with one object that holds `map`.
ByteList oneObject(const ByteList& map) {
    ByteList file = head({"thing"});
    file.u32(5).u8(0).u32(0).u32(1).u32(0).u32(0);
    return file.u32(map.size()).add(map);
}

TEST(BinaryMessages, TellWhatIsWrong) {
    const string nul("a\0b", 3);
    const ByteList unknown = ByteList()
                                 .u8(0)
                                 .u32(2)
                                 .text("odd")
                                 .text("no type")
                                 .u32(2)
                                 .u16(0)
                                 .text("x")
                                 .text("u8")
                                 .u32(2)
                                 .u8(0)
                                 .u8(7);
    const ByteList badNames = ByteList()
                                  .u8(0)
                                  .u32(3)
                                  .text(nul)
                                  .text("u8")
                                  .u32(2)
                                  .u16(0)
                                  .text("")
                                  .text("u8")
                                  .u32(2)
                                  .u16(0)
                                  .text("x")
                                  .text("u8")
                                  .u32(2)
                                  .u8(0)
                                  .u8(7);
    const ByteList unknownItem = ByteList()
                                     .u8(0)
                                     .u32(1)
                                     .text("list")
                                     .text("array")
                                     .u32(39)
                                     .u8(0)
                                     .u32(2)
                                     .u32(0)
                                     .text("no type")
                                     .u32(3)
                                     .raw("abc")
                                     .text("u8")
                                     .u32(2)
                                     .u8(0)
                                     .u8(7);
    const ByteList lyingSize = ByteList().u8(0).u32(1).text("odd").text("no type").u32(9).u16(0);
    const ByteList badItem =
        ByteList().u8(0).u32(1).text("list").text("array").u32(16).u8(0).u32(1).u32(0).text(nul);
    const ByteList longText =
        ByteList().u8(0).u32(1).text("s").text("string").u32(5).u8(0).u32(0x10000001);
    const string unknownMessage =
        "2 map attribute: Attribute 'odd' has unknown type. This may be caused by newer version or "
        "corrupted file. Trying to skip...\n";
    const string badNameMessage = "2 map attribute: An attribute has an invalid name. Probably a "
                                  "corrupted file. Trying to skip...\n";
    const string dummyMessage = "3 plugin factory| Unsupported plugin type thing! Objects of this "
                                "type will have limited functionality.\n";
    struct Case {
        const char* name;
        ByteList file;
        string outcome;
        string log;
    };
    const Case cases[] = {
        {"magic", ByteList().raw("BPF2").u32(1), "plugin factory: 'input' is no binary document!",
         ""},
        {"factory version", ByteList().raw("BPF1").u32(2),
         "plugin factory: Unsupported plugin factory version! Current version 1, needed 2.", ""},
        {"flags", ByteList().raw("BPF1").u32(1).u32(2),
         "plugin factory: 'input' has the unknown flags 2!", ""},
        {"table version", ByteList().raw("BPF1").u32(1).u32(0).u32(3),
         "factory: Unsupported factory version! Supported version 1, needed 3.", ""},
        {"long type", ByteList().raw("BPF1").u32(1).u32(0).u32(1).u32(1).u32(2049),
         "factory: Attribute type with more then 2K detected! Probably a corrupted file.", ""},
        {"unknown type in the table",
         ByteList()
             .raw("BPF1")
             .u32(1)
             .u32(0)
             .u32(1)
             .u32(2)
             .text("u8")
             .text("x")
             .u32(0)
             .text("")
             .u32(5)
             .u8(0)
             .u32(0)
             .u32(0),
         "true", "3 factory: Detected unknown item type during loading - 'x'!\n"},
        {"type out of range", head({"thing"}).u32(5).u8(0).u32(0).u32(1).u32(1).u32(0), "false",
         "2 plugin factory| Invalid plugin type record for id 0/1, aborting...\n"},
        {"id out of place", head({"thing"}).u32(5).u8(0).u32(0).u32(1).u32(0).u32(4), "false",
         "2 plugin factory| Invalid plugin type record for id 4/0, aborting...\n"},
        {"unknown object", oneObject(ByteList().u8(0).u32(0)), "true", dummyMessage},
        {"unknown attribute", oneObject(unknown), "true", dummyMessage + unknownMessage},
        {"lying size", oneObject(lyingSize), "stream 'input': seeking pass the end of stream!",
         dummyMessage + unknownMessage},
        {"names", oneObject(badNames), "true", dummyMessage + badNameMessage + badNameMessage},
        {"unknown element", oneObject(unknownItem), "true",
         dummyMessage + "3 array attribute: Unknown attribute type 'no type'. Ignoring...\n"},
        {"type of an element", oneObject(badItem),
         "array attribute: Unable to read the attribute type inside! Probably a corrupted file!",
         dummyMessage},
        {"long string", oneObject(longText),
         "Trying to read a string bigger then 256MB, aborting...", dummyMessage},
    };
    for (const Case& test : cases) {
        const LogCapture log;
        EXPECT_EQ(outcomeOf(test.file), test.outcome) << test.name;
        EXPECT_EQ(linesOf(log), test.log) << test.name;
    }

    // What stands behind the fault is there.
    for (const ByteList* map : {&unknown, &badNames, &unknownItem}) {
        const LogCapture log;
        PluginFactory factory;
        EXPECT_EQ(outcomeOf(oneObject(*map).bytes(), Source::pipe, factory), "true");
        const ref<IPlugin> object = factory.plugin(0);
        ASSERT_TRUE(object);
        EXPECT_TRUE(isDummy(*object));
        ASSERT_EQ(object->size(), 1u);
        const AttribArray* list = object->findArray(named("list"));
        if (list) {
            ASSERT_EQ(list->size(), 2u);
            EXPECT_FALSE(list->item(0));
        }
        const Attribute* seven = list ? list->item(1) : object->findAttribute(named("x"));
        ASSERT_TRUE(seven);
        EXPECT_EQ(seven->toString(), "7");
    }
}

TEST(BinaryMessages, TellOfReferencesToNothing) {
    ByteList map;
    map.u8(0).u32(2).text("one").text("plugin").u32(5).u8(0).u32(5);
    map.text("way").text("link").u32(1 + 4 + 9).u8(0).u32(1).u32(0).u32(5).u8(0);
    const ByteList file = oneObject(map);
    PluginFactory factory;
    factory.create(named("thing"));
    const LogCapture log;
    EXPECT_EQ(outcomeOf(file.bytes(), Source::checkedView, factory), "true");
    EXPECT_EQ(linesOf(log),
              "3 plugin factory| A reference to the missing plugin 6 is left empty.\n");
    EXPECT_FALSE(*factory.plugin(1)->findAttribute<ref<IPlugin>>(named("one")));
    EXPECT_EQ(factory.plugin(1)->findAttribute(named("way"), false)->toString(), "Plugin[6]");
}

/// `levels` maps in each other.
ByteList nested(unsigned levels) {
    ByteList inner = ByteList().u8(0).u32(0);
    for (unsigned i = 1; i < levels; ++i) {
        ByteList outer;
        outer.u8(0).u32(1).text("m").text("map").u32(inner.size()).add(inner);
        inner = outer;
    }
    return inner;
}

TEST(BinaryHostile, DepthIsLimited) {
    const LogCapture log;
    const string tooDeep = "Attributes are nested deeper than 256 levels.";
    EXPECT_EQ(outcomeOf(oneObject(nested(256))), "true");
    EXPECT_EQ(outcomeOf(oneObject(nested(257))), tooDeep);

    for (const int levels : {256, 257}) {
        PluginFactory factory;
        AttribMap* map = factory.create(named("thing")).get();
        for (int i = 1; i < levels; ++i)
            map = &map->mapAttribute(named("m"), {});
        if (levels > 256) {
            EXPECT_THROW(written(factory), exception);
            continue;
        }
        PluginFactory read;
        EXPECT_EQ(outcomeOf(written(factory), Source::checkedView, read), "true");
    }
}

/// A document of a few objects, references, structures and values.
Bytes richDocument() {
    PluginFactory factory;
    for (int i = 0; i < 3; ++i)
        factory.create(named("thing"))->attribute<string>(named("name")) = "n";
    IPlugin& object = *factory.plugin(1);
    detail::addStructures(object);
    object.vecAttribute<ref<IPlugin>>(named("all")) = {factory.plugin(0), factory.plugin(2)};
    object.attribute(named("way"),
                     new AttribLink(AttribPath(*factory.plugin(2), named("list")).element(1)));
    object.vecAttribute<mat43>(named("matrices")).resize(2);
    object.vecAttribute<string>(named("texts")) = {"a", "bc"};
    factory.attributes().attribute<ref<IPlugin>>(named("main")) = factory.plugin(1);
    return written(factory);
}

/// Keeps messages off the log: they are many, and take memory.
class Silence {
public:
    Silence() { log().setLevelLimit(logText); }
    ~Silence() { log().setLevelLimit(limitBefore_); }

private:
    int limitBefore_ = log().levelLimit();
};

TEST(BinaryHostile, CutDocumentsDoNoHarm) {
    const Bytes whole = richDocument();
    const Silence silence;
    for (std::size_t length = 0; length < whole.size(); ++length) {
        const Bytes cut(whole.cbegin(), whole.cbegin() + length);
        for (const Source source : {Source::view, Source::checkedView, Source::pipe}) {
            PluginFactory factory;
            factory.create(named("thing"));
            const string outcome = outcomeOf(cut, source, factory);
            const bool isRead = outcome == "true";
            EXPECT_EQ(factory.pluginCount(), isRead ? 4u : 1u) << length << outcome;
            if (source == Source::checkedView)
                EXPECT_TRUE(outcome.starts_with("stream 'input': trying to read ")) << length;
            else
                EXPECT_TRUE(isRead || outcome == "false" || outcome.starts_with("array attribute"))
                    << length << outcome;
        }
    }
}

/// A byte or a number that is wrong costs no more memory than the file and the buffers.
TEST(BinaryHostile, WrongBytesDoNoHarm) {
    const Bytes whole = richDocument();
    const long limit = 5 * 64 * 1024;
    const Silence silence;
    long greatest = 0;
    const auto readDamaged = [&](const Bytes& bytes) {
        for (const Source source : {Source::view, Source::pipe}) {
            PluginFactory factory;
            const long before = allocatedBytes();
            outcomeOf(bytes, source, factory);
            greatest = std::max(greatest, allocatedBytes() - before);
            if (factory.pluginCount() != 0) {
                Bytes again = written(factory);
                PluginFactory second;
                EXPECT_EQ(outcomeOf(again, Source::checkedView, second), "true");
                EXPECT_EQ(written(second), again);
            }
        }
    };
    for (std::size_t i = 0; i < whole.size(); ++i) {
        for (const int change : {0x01, 0x80, 0xff}) {
            Bytes damaged = whole;
            damaged[i] = static_cast<u8>(damaged[i] ^ change);
            readDamaged(damaged);
        }
        for (const u32 huge : {0xffffffffu, 0xfffffffeu, 0x10000000u, 0x00ffffffu}) {
            if (i + sizeof huge > whole.size())
                break;
            Bytes damaged = whole;
            std::memcpy(damaged.data() + i, &huge, sizeof huge);
            readDamaged(damaged);
        }
    }
    EXPECT_LT(greatest, limit);
}

} // namespace
