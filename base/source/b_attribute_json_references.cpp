#include "b_attribute_json_forms.h"
#include "b_log.h"

#include <charconv>

namespace base {

namespace {

constexpr string_view idPrefix = "Plugin[";

/// The number in "Plugin[12]"; false for any other text.
bool parseId(string_view text, u32& id) {
    if (!text.starts_with(idPrefix) || !text.ends_with(']'))
        return false;
    const char* first = text.data() + idPrefix.size();
    const char* last = text.data() + text.size() - 1;
    const auto [at, error] = std::from_chars(first, last, id);
    return error == std::errc() && at == last;
}

} // namespace

const string* plainNameOf(const IPlugin& object) {
    static const name_id nameOfName = nameServer().id("name");
    const Attribute* found = object.findAttribute(nameOfName, false, false);
    if (!found || found->type() != TypeTraits<string>::n_name || !isStored(*found))
        return nullptr;
    const auto& text = *static_cast<const string*>(found->data(-1));
    const bool isClear = !text.empty() && text != "null" && text != "~null" &&
                         !text.starts_with(idPrefix) && isValidUtf8(text);
    return isClear ? &text : nullptr;
}

bool isWritten(const IPlugin& object, const JSONWriteOptions& options) {
    if (object.hasFlag(attribTransient) || object.id() == IPlugin::noId)
        return false;
    return !options.factory || (object.id() < options.factory->pluginCount() &&
                                options.factory->plugins()[object.id()].get() == &object);
}

const string* uniqueNameOf(const IPlugin& object, const JSONWriteOptions& options) {
    return object.id() < options.uniqueNames.size() ? options.uniqueNames[object.id()] : nullptr;
}

void writeReference(const IPlugin* object, string_view noneText, DataWriter& out,
                    const JSONWriteOptions& options) {
    if (object && isWritten(*object, options)) {
        const string* name = uniqueNameOf(*object, options);
        out.text(name ? *name : string(idPrefix) + std::to_string(object->id()) + ']');
        return;
    }
    if (object)
        log().log(logSystem, logWarning,
                  "json writer| Attribute '{}::{}' refers to an object that is not written!",
                  options.owner, options.attribute);
    out.text(noneText);
}

IPlugin* findNamed(const DataReader& in, string_view text, const JSONReadOptions& options) {
    const auto found = options.placeOfName.find(text);
    if (found == options.placeOfName.end())
        return nullptr;
    if ((found->second & JSONReadOptions::severalObjects) != 0)
        log().log(logSystem, logWarning,
                  "json parser {}({})| Several plugins have the name '{}', taking the first!",
                  in.source(), in.line(), text);
    return options.objects[found->second & ~JSONReadOptions::severalObjects].get();
}

IPlugin* findReferenced(const DataReader& in, string_view text, const JSONReadOptions& options) {
    u32 place = 0;
    IPlugin* found = nullptr;
    if (parseId(text, place) && place < options.objects.size())
        found = options.objects[place].get();
    if (!found)
        found = findNamed(in, text, options);
    if (!found)
        logMissingObject(in, text);
    return found;
}

void logMissingObject(const DataReader& in, string_view text) {
    log().log(logSystem, logError, "json parser {}({})| Unable to find plugin with name '{}'!",
              in.source(), in.line(), text);
}

} // namespace base
