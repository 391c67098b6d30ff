#include "b_cmdline.h"

#include "b_format.h"
#include "b_log.h"
#include "b_string_convert.h"

namespace base {

namespace {

string_view withoutDash(string_view name) {
    if (name.starts_with('-'))
        name.remove_prefix(1);
    return name;
}

bool answersTo(const CmdLineOption& option, string_view name) {
    const string_view bare = withoutDash(name);
    return !bare.empty() &&
           (bare == withoutDash(option.name) || bare == withoutDash(option.shortName));
}

string optionError(const CmdLineOption& option, string_view name, string_view problem) {
    string text = format("option '{}': {}.", name, problem);
    if (!option.syntax.empty())
        text += format("\n syntax: {} {}\n", name, option.syntax);
    return text;
}

} // namespace

CmdLineOption::~CmdLineOption() = default;

template <class T>
CmdLineValue<T>::~CmdLineValue() = default;

template <class T>
string CmdLineValue<T>::help() const {
    string text = name;
    if (!shortName.empty())
        text += ", " + shortName;
    if (!syntax.empty())
        text += " " + syntax;
    if (!defaultText.empty())
        text += " (default: " + defaultText + ")";
    text += "\n";
    if (!helpText.empty())
        text += "    " + helpText + "\n";
    return text;
}

template <class T>
void CmdLineValue<T>::parse(string_view givenName, const vector<string>& givenTokens,
                            vector<string>& errors) {
    if (seen && (flags & mayRepeat) == 0) {
        errors.push_back(
            format("option '{}' already specified, ignoring this definition.\n", givenName));
        return;
    }
    if (givenTokens.size() < valueCount) {
        errors.push_back(optionError(*this, givenName, "wrong number of values"));
        return;
    }
    vector<T> read;
    for (const string& token : givenTokens) {
        T value{};
        if (!tryFromString(token, value)) {
            errors.push_back(optionError(*this, givenName, "type mismatch"));
            return;
        }
        read.push_back(std::move(value));
    }
    values.append(read.cbegin(), read.cend());
    tokens.append(givenTokens.cbegin(), givenTokens.cend());
    seen = true;
}

template <class T>
string CmdLineValue<T>::toString() const {
    string text = name;
    for (const T& value : std::as_const(values))
        text += format(" {}", value);
    return text;
}

template <class T>
CmdLineValue<T>* CmdLineOptions::add(string_view group, string_view name, string_view shortName,
                                     string_view helpText, const T& defaultValue) {
    if (!accepts(name, shortName))
        return nullptr;
    ref<CmdLineValue<T>> option = makeRef<CmdLineValue<T>>();
    option->name = name;
    option->shortName = shortName;
    option->helpText = helpText;
    option->defaultText = format("{}", defaultValue);
    insert(group, option);
    return option.get();
}

CmdLineOption* CmdLineOptions::find(string_view name) const {
    for (const CmdLineGroup& group : groups_) {
        for (const ref<CmdLineOption>& option : group.options) {
            if (answersTo(*option, name))
                return option.get();
        }
    }
    return nullptr;
}

bool CmdLineOptions::accepts(string_view name, string_view shortName) const {
    if (withoutDash(name).empty()) {
        log().log(logAll, logError, "Command line option without a name detected, skipping...");
        return false;
    }
    return !find(name) && !find(shortName);
}

void CmdLineOptions::insert(string_view group, ref<CmdLineOption> option) {
    auto at = std::find_if(groups_.begin(), groups_.end(),
                           [&](const CmdLineGroup& g) { return g.name == group; });
    if (at == groups_.end()) {
        groups_.push_back(CmdLineGroup{string(group), {}});
        at = groups_.end() - 1;
    }
    at->options.push_back(std::move(option));
}

#define BASE_INSTANTIATE_OPTION(T)                              \
    template class CmdLineValue<T>;                             \
    template BASE1_API CmdLineValue<T>* CmdLineOptions::add<T>( \
        string_view, string_view, string_view, string_view, const T&);
BASE_INSTANTIATE_OPTION(bool)
BASE_INSTANTIATE_OPTION(float)
BASE_INSTANTIATE_OPTION(u32)
BASE_INSTANTIATE_OPTION(u8)
BASE_INSTANTIATE_OPTION(string)

} // namespace base
