#include "scene_options.h"

#include "scene_schema.h"

#include "b_cmdline.h"
#include "b_format.h"
#include "b_string_convert.h"

#include <array>

namespace scene {

namespace {

/// The words for the values of a setting, by number; none for a setting without words.
template <class T>
constexpr std::array<const char*, 0> words{};
template <>
constexpr std::array words<Presence>{"never", "present", "always"};
template <>
constexpr std::array words<NormalsMethod>{"smooth", "flat"};
template <>
constexpr std::array words<TangentsMethod>{"standard"};

using Words = std::span<const char* const>;

base::string joined(Words list) {
    base::string text;
    for (const char* word : list) {
        if (!text.empty())
            text += '|';
        text += word;
    }
    return text;
}

template <class T>
void addOption(base::CmdLineOptions& options, const char* group, const char* name, const char* help,
               const T& defaultValue) {
    if constexpr (std::is_enum_v<T>) {
        const base::string word = words<T>[static_cast<std::size_t>(defaultValue)];
        if (auto* option = options.add<base::string>(group, name, "", help, word))
            option->syntax = joined(words<T>);
    } else {
        options.add<T>(group, name, "", help, defaultValue);
    }
}

template <class T>
void storeDefault(base::AttribMap& parameters, base::name_id name, const T& defaultValue) {
    if constexpr (std::is_enum_v<T>)
        parameters.attribute<Enumeration>(name) = static_cast<Enumeration>(defaultValue);
    else
        parameters.attribute<T>(name) = defaultValue;
}

/// The words of the setting called `name`, in either table.
Words wordsOf(base::string_view name) {
#define SCENE_MATCH(setting, type, ...) \
    if (name == #setting)               \
        return words<type>;
    SCENE_IMPORTER_TABLE(SCENE_MATCH, SCENE_MATCH)
    SCENE_EXPORTER_TABLE(SCENE_MATCH, SCENE_MATCH, SCENE_MATCH)
#undef SCENE_MATCH
    return {};
}

/// The number that `text` stands for among `list`: that of the word, or the number itself.
bool parseWord(Words list, const base::string& text, Enumeration& value) {
    const base::string word = base::toLower(base::trimmed(text));
    for (std::size_t i = 0; i < list.size(); ++i) {
        if (word == list[i]) {
            value = static_cast<Enumeration>(i);
            return true;
        }
    }
    return base::tryFromString(word, value) && value < list.size();
}

template <class T>
void store(base::AttribMap& parameters, base::name_id name, const T& value) {
    auto attribute = std::make_unique<base::TypedAttribute<T>>(value);
    parameters.attribute(name, attribute.get());
    attribute.release();
}

template <class T>
bool storeValue(const base::CmdLineOption& option, base::AttribMap& parameters,
                base::name_id name) {
    const auto* typed = dynamic_cast<const base::CmdLineValue<T>*>(&option);
    if (!typed || typed->values.empty())
        return false;
    store(parameters, name, typed->values.back());
    return true;
}

void applyOption(const base::CmdLineOption& option, base::AttribMap& parameters,
                 base::vector<base::string>& errors) {
    base::string_view text = option.name;
    if (text.starts_with('-'))
        text.remove_prefix(1);
    const base::name_id name = base::nameServer().id(text);

    const auto* typed = dynamic_cast<const base::CmdLineValue<base::string>*>(&option);
    const Words list = wordsOf(text);
    if (!typed || typed->values.empty() || list.empty()) {
        storeValue<bool>(option, parameters, name) || storeValue<float>(option, parameters, name) ||
            storeValue<base::u32>(option, parameters, name) ||
            storeValue<base::u8>(option, parameters, name) ||
            storeValue<base::string>(option, parameters, name);
        return;
    }
    Enumeration number = 0;
    if (parseWord(list, typed->values.back(), number))
        store(parameters, name, number);
    else
        errors.push_back(base::format("option '{}': type mismatch.\n syntax: {} {}\n", option.name,
                                      option.name, option.syntax));
}

} // namespace

void sceneExporter_schema::bindSettings(base::AttribMap& object) {
    *this = {};
#define SCENE_BIND(name, ...) object.syncAttribute(n_##name, name);
#define SCENE_SKIP(...)
    SCENE_EXPORTER_TABLE(SCENE_BIND, SCENE_SKIP, SCENE_BIND)
#undef SCENE_BIND
    if (const auto* paths = find(object, n_resourcePaths))
        resourcePaths = *paths;
}

void register_importer_schema() {
    static const bool once = (internNames(sceneImporter_schema::names()), true);
    static_cast<void>(once);
}

void register_exporter_schema() {
    static const bool once = (internNames(sceneExporter_schema::names()), true);
    static_cast<void>(once);
}

#define SCENE_STORE(name, type, defaultValue, ...) \
    storeDefault<type>(parameters, Schema::n_##name, defaultValue);

void fillImporterDefaults(base::AttribMap& parameters) {
    using Schema = sceneImporter_schema;
    SCENE_IMPORTER_TABLE(SCENE_STORE, SCENE_STORE)
    parameters.setTypeName(Schema::n_kind);
}

void fillExporterDefaults(base::AttribMap& parameters) {
    using Schema = sceneExporter_schema;
    SCENE_EXPORTER_TABLE(SCENE_STORE, SCENE_SKIP, SCENE_STORE)
    parameters.setTypeName(Schema::n_kind);
}

#define SCENE_ADD_OPTION(name, type, defaultValue, help) \
    addOption<type>(options, group, "-" #name, help, defaultValue);

void registerImporterOptions(base::CmdLineOptions& options) {
    const char* const group = "importer";
    SCENE_IMPORTER_TABLE(SCENE_ADD_OPTION, SCENE_SKIP)
}

void registerExporterOptions(base::CmdLineOptions& options) {
    const char* const group = "exporter";
    SCENE_EXPORTER_TABLE(SCENE_ADD_OPTION, SCENE_ADD_OPTION, SCENE_SKIP)
}

void applyOptions(const base::CmdLineOptions& options, base::string_view group,
                  base::AttribMap& parameters, base::vector<base::string>& errors) {
    for (const base::CmdLineGroup& candidate : options.groups()) {
        if (candidate.name != group)
            continue;
        for (const base::ref<base::CmdLineOption>& option : candidate.options) {
            if (option->seen)
                applyOption(*option, parameters, errors);
        }
    }
}

} // namespace scene
