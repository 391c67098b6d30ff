#pragma once

#include "b_config.h"
#include "b_containers.h"
#include "b_types.h"

#include <concepts>

/// Conversions between values and text, independent of the locale.
namespace base {

/// "%.3g" above a magnitude of 1e30, else six decimals with trailing zeros (and a final point)
/// removed; "nan", "inf" and "-inf" for what is not finite.
BASE1_API string toString(double value);
/// "true" or "false"; a template, so that pointers do not turn into bool.
template <std::same_as<bool> T>
string toString(T value) {
    return value ? "true" : "false";
}

/// The value that the whole text stands for; blanks around it are ignored. Integers are decimal
/// and range-checked, a sign "+" is refused; reals take decimal and exponent forms, but not the
/// words for infinity and NaN; bool takes 1, true, yes and 0, false, no in any case; string takes
/// the text as it is.
/// Throws `string_conversion_exception` if the text is anything else. Defined for bool, the
/// integer types of `b_types`, float, double and string.
template <class T>
BASE1_API T from_string(string_view text);

/// As `from_string`, but false in place of the exception; `value` is untouched then.
template <class T>
BASE1_API bool tryFromString(string_view text, T& value);

/// ASCII letters in lower case; every other byte stays.
BASE1_API string toLower(string_view text);

/// The text without blanks, tabs and line ends at both sides.
BASE1_API string_view trimmed(string_view text);

/// The parts of a list, in order, the empty ones included: one more than there are separators.
BASE1_API vector<string_view> split(string_view text, char separator);

/// The text with U+FFFD in the place of each broken UTF-8 sequence; valid text is returned
/// unchanged.
BASE1_API string toValidUtf8(string_view text);
/// The beginning of UTF-8 text, at most `longest` bytes, that ends with a whole character.
BASE1_API string_view cutUtf8(string_view text, std::size_t longest);

} // namespace base
