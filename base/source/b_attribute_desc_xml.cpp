#include "b_attribute_desc_xml.h"

#include "b_exception.h"
#include "b_log.h"
#include "b_string_convert.h"

#include <pugixml.hpp>

namespace base {

namespace {

constexpr unsigned parseOptions =
    pugi::parse_cdata | pugi::parse_escapes | pugi::parse_eol | pugi::parse_wconv_attribute;
static_assert(parseOptions == 0x74);

struct TextKey {
    const char* key;
    string AttribDesc::*member;
};
constexpr TextKey textKeys[] = {
    {"label", &AttribDesc::label},      {"initialisator", &AttribDesc::initialisator},
    {"action", &AttribDesc::action},    {"default", &AttribDesc::defaultValue},
    {"min", &AttribDesc::min},          {"max", &AttribDesc::max},
    {"soft_min", &AttribDesc::softMin}, {"soft_max", &AttribDesc::softMax},
    {"enum", &AttribDesc::enumeration}, {"units", &AttribDesc::units},
};

struct SwitchKey {
    const char* key;
    AttribDescFlag flag;
};
constexpr SwitchKey switchKeys[] = {
    {"visible", descVisible},    {"resource", descResource}, {"optional", descOptional},
    {"read-only", descReadOnly}, {"cmdline", descCmdline},   {"state", descState},
    {"keyable", descKeyable},
};

const char* textOf(const pugi::xml_node& element, const char* key) {
    return element.attribute(key).value();
}

/// Absent for an attribute that is absent or empty.
name_id nameOf(string_view text) {
    return text.empty() ? name_id() : nameServer().id(text);
}

bool isSwitchedOn(const pugi::xml_node& element, const char* key) {
    bool value = false;
    return tryFromString(textOf(element, key), value) && value;
}

/// The attribute types have but one name for a quaternion.
string_view typeOf(string_view text) {
    return text == "quat" ? "quatf" : text;
}

/// Help texts are escaped once more than XML asks for. Each sequence is replaced where it is found
/// and not looked at again, so that "&amp;lt;" gives the text "&lt;".
string unescaped(string_view text) {
    static constexpr std::pair<string_view, char> sequences[] = {
        {"&amp;", '&'}, {"&lt;", '<'}, {"&gt;", '>'}};
    string out;
    while (!text.empty()) {
        char character = text.front();
        std::size_t length = 1;
        for (const auto& [sequence, meaning] : sequences) {
            if (!text.starts_with(sequence))
                continue;
            character = meaning;
            length = sequence.size();
        }
        out += character;
        text.remove_prefix(length);
    }
    return out;
}

class Reader {
public:
    Reader(const string& path, const AttribDescManager& manager) : path_(path), manager_(manager) {}

    AttribDescFile read(string text) {
        pugi::xml_document document;
        parse(document, text);
        AttribDescFile file;
        const pugi::xml_node root = document.document_element();
        file.attributes = {textOf(root, "namespace"), textOf(root, "destination"),
                           textOf(root, "constructor")};
        for (const pugi::xml_node top : document.children("Document"))
            for (const pugi::xml_node element : top.children("AttributeMap"))
                if (ref<AttribMapDesc> desc = readMap(element))
                    file.descs.push_back(std::move(desc));
        return file;
    }

private:
    /// Parses in place: `text` must outlive the document.
    void parse(pugi::xml_document& document, string& text) const {
        const pugi::xml_parse_result result = document.load_buffer_inplace(
            text.data(), text.size(), parseOptions, pugi::encoding_utf8);
        if (result)
            return;
        log().log(logSystem, logError,
                  "attribute descriptions| Unable to parse file {}, error at byte {}", path_,
                  static_cast<i64>(result.offset));
        throw exception(result.description(), "b_attribute_desc", "base::AttribDescManager::load",
                        __LINE__);
    }

    /// Null for a type without a name, which nobody could find.
    ref<AttribMapDesc> readMap(const pugi::xml_node& element) const {
        auto desc = makeRef<AttribMapDesc>(manager_);
        desc->name = nameOf(textOf(element, "name"));
        if (!desc->name) {
            log().log(logSystem, logWarning,
                      "attribute descriptions| Skipped a map without a name in file {}", path_);
            return nullptr;
        }
        desc->friendName = nameOf(textOf(element, "friend"));
        desc->inherit = nameOf(textOf(element, "inherit"));
        desc->className = nameOf(textOf(element, "class"));
        desc->label = textOf(element, "label");
        desc->help = unescaped(textOf(element, "help"));
        desc->copyright = textOf(element, "copyright");
        desc->isAbstract = isSwitchedOn(element, "abstract");
        const string_view flags = textOf(element, "flags");
        if (flags.find("singleInstance") != string_view::npos)
            desc->flags |= descSingleInstance;
        if (flags.find("customDescriptor") != string_view::npos)
            desc->flags |= descCustomDescriptor;
        for (const pugi::xml_node child : element.children("Attribute")) {
            const ref<const AttribDesc> attribute = readAttribute(child, *desc);
            desc->attributes.push_back(attribute);
            if (attribute->name)
                desc->attributesByName.try_emplace(attribute->name, attribute);
        }
        return desc;
    }

    ref<AttribDesc> readAttribute(const pugi::xml_node& element, const AttribMapDesc& owner) const {
        auto desc = makeRef<AttribDesc>();
        desc->name = nameOf(textOf(element, "name"));
        desc->type = typeOf(textOf(element, "type"));
        desc->typeName = nameOf(desc->type);
        if (desc->type == "arrayof")
            desc->elementType = nameOf(typeOf(textOf(element, "of")));
        desc->control = nameOf(textOf(element, "control"));
        for (const auto& [key, member] : textKeys)
            (*desc).*member = textOf(element, key);
        desc->help = unescaped(textOf(element, "help"));
        for (const auto& [key, flag] : switchKeys)
            if (isSwitchedOn(element, key))
                desc->flags |= flag;
        desc->precision = readNumber(element, "precision", owner);
        desc->controlLines = readNumber(element, "control-lines", owner);
        return desc;
    }

    u32 readNumber(const pugi::xml_node& element, const char* key,
                   const AttribMapDesc& owner) const {
        const pugi::xml_attribute number = element.attribute(key);
        u32 value = 0;
        if (number && !tryFromString(number.value(), value))
            log().log(
                logSystem, logWarning,
                "attribute descriptions| The {} '{}' of attribute '{}' in map '{}' of file {} "
                "is no number and counts as 0",
                key, number.value(), textOf(element, "name"), owner.name, path_);
        return value;
    }

    const string& path_;
    const AttribDescManager& manager_;
};

} // namespace

AttribDescFile readAttribDescs(string text, const string& path, const AttribDescManager& manager) {
    return Reader(path, manager).read(std::move(text));
}

} // namespace base
