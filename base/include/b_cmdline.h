#pragma once

#include "b_containers.h"
#include "b_refcnt.h"
#include "b_types.h"

/// Command-line options and their registry.
namespace base {

/// One option. Parsing collects error texts instead of throwing.
class BASE1_API CmdLineOption : public RefCnt {
public:
    static constexpr u32 mayRepeat = 1u << 1;

    ~CmdLineOption() override;
    /// Lines for a list of options: names, syntax and default on the first, below it the help
    /// text, indented.
    virtual string help() const = 0;
    /// Takes `tokens` as the values given under `name`, which appears in messages. What is wrong
    /// with them is appended to `errors` as one text, and the option stays as it was.
    virtual void parse(string_view name, const vector<string>& tokens, vector<string>& errors) = 0;
    /// The option's name and each value, joined by blanks.
    virtual string toString() const = 0;

    CmdLineOption* parent = nullptr;
    string name;
    string shortName; ///< empty for none
    string helpText;
    bool seen = false; ///< set by `parse`
    u32 flags = 0;
    u32 valueCount = 1; ///< values it needs
    string syntax;      ///< of the values, for messages; empty for none
    string defaultText; ///< for the list of options; empty for none
};

/// An option with values of type T: bool, float, u32, u8 or string.
template <class T>
class BASE1_API CmdLineValue final : public CmdLineOption {
public:
    ~CmdLineValue() override;
    string help() const override;
    void parse(string_view name, const vector<string>& tokens, vector<string>& errors) override;
    string toString() const override;

    vector<string> tokens; ///< as given
    vector<T> values;      ///< one for each token; empty while the option is not seen
};

extern template class CmdLineValue<bool>;
extern template class CmdLineValue<float>;
extern template class CmdLineValue<u32>;
extern template class CmdLineValue<u8>;
extern template class CmdLineValue<string>;

struct CmdLineGroup {
    string name;
    vector<ref<CmdLineOption>> options;
};

/// The registry: groups in the order of their first option.
class BASE1_API CmdLineOptions {
public:
    /// Adds an option to `group`. A nameless option is logged and left out; one whose name or
    /// short name is taken in any group (a leading "-" does not count) is left out silently:
    /// null in both cases. The option belongs to the registry. T is a type of `CmdLineValue`.
    template <class T>
    CmdLineValue<T>* add(string_view group, string_view name, string_view shortName,
                         string_view helpText, const T& defaultValue);

    /// The option of that name or short name, with or without the leading "-".
    CmdLineOption* find(string_view name) const;
    const vector<CmdLineGroup>& groups() const noexcept { return groups_; }

private:
    bool accepts(string_view name, string_view shortName) const;
    void insert(string_view group, ref<CmdLineOption> option);

    vector<CmdLineGroup> groups_;
};

} // namespace base
