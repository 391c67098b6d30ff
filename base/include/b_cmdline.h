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
    /// Text for the list of options: names, default and help.
    virtual string help() const = 0;
    /// Takes `tokens` as the values given under `name`; what is wrong with them is appended to
    /// `errors` and leaves the option unset.
    virtual void parse(string_view name, const vector<string>& tokens,
                       vector<string>& errors) = 0;
    /// The name and each value, joined by blanks.
    virtual string toString() const = 0;

    CmdLineOption* parent = nullptr;
    string name;
    string shortName;
    string helpText;
    string syntax;
    string defaultText;
    bool seen = false;
    u32 flags = 0;
    u32 valueCount = 1; ///< values it needs
};

/// An option with values of type T: bool, float, u32, u8 or string.
template <class T>
class BASE1_API CmdLineValue final : public CmdLineOption {
public:
    ~CmdLineValue() override;
    string help() const override;
    void parse(string_view name, const vector<string>& tokens, vector<string>& errors) override;
    string toString() const override;

    vector<string> tokens;
    vector<T> values;
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
    /// short name is taken in any group (a leading "-" does not count) is left out silently.
    /// Null then, else the option, owned by the registry.
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
