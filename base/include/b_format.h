#pragma once

#include "b_containers.h"
#include "b_name.h"

#include <concepts>
#include <span>

/// The framework's text formatter, for messages.
namespace base {

/// One argument of `format`: a copy of a number, or a reference to text that must outlive it.
/// Integers of all widths print as numbers, bool as "true" or "false", null texts as "(null)",
/// reals as attributes print them. Enumerations and pointers do not convert; callers cast.
class BASE1_API FormatArg {
public:
    template <std::same_as<bool> T>
    FormatArg(T value) : kind_(Kind::text), text_(value ? "true" : "false") {}
    template <std::signed_integral T>
    FormatArg(T value) : kind_(Kind::integer), integer_(value) {}
    template <std::unsigned_integral T>
    requires(!std::same_as<T, bool>) FormatArg(T value) : kind_(Kind::natural), natural_(value) {}
    template <std::floating_point T>
    FormatArg(T value) : kind_(Kind::real), real_(static_cast<double>(value)) {}
    FormatArg(string_view value) : kind_(Kind::text), text_(value) {}
    FormatArg(const string& value) : FormatArg(string_view(value)) {}
    FormatArg(const char* value) : FormatArg(string_view(value ? value : "(null)")) {}
    FormatArg(name_id value) : FormatArg(value.view()) {}

    void appendTo(string& out) const;

private:
    enum class Kind { text, integer, natural, real };
    Kind kind_;
    union {
        i64 integer_;
        u64 natural_;
        double real_;
    };
    string_view text_;
};

/// `pattern` with its placeholders replaced in one pass: `{}` is the next argument, `{,N}` the
/// next argument padded with blanks to N characters, right-aligned (left-aligned for negative
/// N). Anything else in braces stays as it is, so does `{}` when the arguments have run out.
/// Surplus arguments are ignored; arguments are never scanned for placeholders. Independent of
/// the locale.
BASE1_API string formatArgs(string_view pattern, std::span<const FormatArg> args);

template <class... Args>
string format(string_view pattern, const Args&... args) {
    if constexpr (sizeof...(Args) == 0) {
        return formatArgs(pattern, {});
    } else {
        const FormatArg list[] = {FormatArg(args)...};
        return formatArgs(pattern, list);
    }
}

} // namespace base
