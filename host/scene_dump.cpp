#include "host/scene_dump.h"

#include "host/printing.h"

#include "b_format.h"
#include "b_string_convert.h"
#include "scene_schema.h"

#include <algorithm>

namespace host {

using base::AttribMap;
using base::Attribute;
using base::IPlugin;
using base::string;
using base::u32;
using base::vector;

namespace {

constexpr u32 deepestLevel = 64; ///< what lies deeper is printed as a tree of its own
constexpr std::size_t longestText = 200;
constexpr u32 mostElements = 4;

using Reference = base::ref<IPlugin>;

string headingOf(const IPlugin& object) {
    const string name = object.getName();
    string text = base::format("{} [{}]", object.typeName(), object.id());
    if (!name.empty())
        text += base::format(" \"{}\"", base::cutUtf8(name, longestText));
    if (isDummy(object))
        text += " (unknown type)";
    return text;
}

/// The attributes that are stored, sorted by name.
vector<AttribMap::Entry> storedEntries(const AttribMap& map) {
    vector<AttribMap::Entry> entries;
    for (const AttribMap::Entry& entry : map.entries())
        if (!entry.second->hasFlag(base::attribTransient))
            entries.push_back(entry);
    std::ranges::sort(entries, {},
                      [](const AttribMap::Entry& entry) { return entry.first.view(); });
    return entries;
}

class Dump {
public:
    explicit Dump(const base::PluginFactory& scene) : printed_(scene.pluginCount()) {}

    /// The object and all that it refers to, unless it was printed before.
    void tree(const IPlugin& object) {
        if (!printed_[object.id()])
            reference("", object, 0);
    }
    string take() { return std::move(text_); }

private:
    void line(u32 level, string content) {
        std::ranges::replace_if(
            content, [](char c) { return c == '\n' || c == '\t'; }, ' ');
        text_.append(std::size_t{level} * 2, ' ').append(printable(content)).append("\n");
    }

    void reference(const string& label, const IPlugin& object, u32 level) {
        const bool isListed = object.id() < printed_.size();
        const bool isNew = isListed && !printed_[object.id()] && level < deepestLevel;
        const char* place = isNew || !isListed ? "" : printed_[object.id()] ? ", above" : ", below";
        line(level, label + headingOf(object) + place);
        if (!isNew)
            return;
        printed_[object.id()] = true;
        attributes(object, level + 1);
    }

    void attributes(const AttribMap& map, u32 level) {
        static const base::name_id nameOfName = base::nameServer().id("name");
        const bool isObject = dynamic_cast<const IPlugin*>(&map) != nullptr;
        for (const auto& [name, attribute] : storedEntries(map))
            if (!isObject || !(name == nameOfName) || attribute->asLink())
                value(string(name.view()) + ": ", *attribute, level);
    }

    void value(const string& label, const Attribute& attribute, u32 level) {
        if (level >= deepestLevel)
            line(level, label + "...");
        else if (const AttribMap* map = attribute.asMap())
            mapValue(label, *map, level);
        else if (const base::AttribArray* array = attribute.asArray())
            arrayValue(label, *array, level);
        else if (attribute.asLink())
            line(level, label + "-> " + attribute.toString());
        else if (attribute.type() == base::TypeTraits<Reference>::n_name)
            referenceValue(label, *static_cast<const Reference*>(attribute.data()), level);
        else if (attribute.type() == base::TypeTraits<Reference>::n_array_name)
            references(label, *static_cast<const vector<Reference>*>(attribute.data()), level);
        else
            line(level, label + plainText(attribute));
    }

    static string plainText(const Attribute& attribute) {
        if (attribute.size() > mostElements)
            return base::format("{} of {}", attribute.type(), attribute.size());
        const string text = attribute.toString();
        return base::format("{} {}{}", attribute.type(), base::cutUtf8(text, longestText),
                            text.size() > longestText ? "..." : "");
    }

    void referenceValue(const string& label, const Reference& object, u32 level) {
        if (object)
            reference(label, *object, level);
        else
            line(level, label + "none");
    }

    void references(const string& label, const vector<Reference>& objects, u32 level) {
        line(level, label + base::format("objects, {}", objects.size()));
        for (const Reference& object : objects)
            referenceValue("", object, level + 1);
    }

    void mapValue(const string& label, const AttribMap& map, u32 level) {
        line(level, label + "map" + (map.typeName() ? " " : "") + map.typeName().text());
        attributes(map, level + 1);
    }

    void arrayValue(const string& label, const base::AttribArray& array, u32 level) {
        line(level, label + base::format("array of {}", array.size()));
        for (u32 i = 0; i < array.size(); ++i) {
            if (const Attribute* item = array.item(i))
                value(base::format("{}: ", i), *item, level + 1);
            else
                line(level + 1, base::format("{}: none", i));
        }
    }

    vector<bool> printed_; ///< by id
    string text_;
};

} // namespace

string sceneText(const base::PluginFactory& scene) {
    Dump dump(scene);
    for (const Reference& object : scene.plugins())
        if (object && object->typeName() == scene::scene_schema::n_kind)
            dump.tree(*object);
    for (const Reference& object : scene.plugins())
        if (object)
            dump.tree(*object);
    return dump.take();
}

} // namespace host
