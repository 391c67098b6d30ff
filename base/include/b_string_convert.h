#pragma once

#include "b_config.h"
#include "b_containers.h"
#include "b_types.h"

/// Conversions between values and text, independent of the locale.
namespace base {

/// "%.3g" above a magnitude of 1e30, else six decimals with trailing zeros (and a final point)
/// removed; "nan", "inf" and "-inf" for what is not finite.
BASE1_API string toString(double value);
BASE1_API string toString(bool value);

/// The value that the whole text stands for; blanks around it are ignored. Integers are decimal
/// and range-checked, a sign "+" is refused; reals take decimal and exponent forms; bool takes
/// 1, true, yes and 0, false, no in any case; string takes the text as it is.
/// Throws `string_conversion_exception` if the text is anything else. Defined for bool, the
/// integer types of `b_types`, float, double and string.
template <class T>
T from_string(string_view text);

/// As `from_string`, false in place of the exception.
template <class T>
bool tryFromString(string_view text, T& value);

/// ASCII letters in lower case; every other byte stays.
BASE1_API string toLower(string_view text);

/// The text without blanks, tabs and line ends at both sides.
BASE1_API string_view trimmed(string_view text);

/// The parts of a list, in order, the empty ones included.
BASE1_API vector<string_view> split(string_view text, char separator);

/// The text with every byte sequence that is not valid UTF-8 replaced by U+FFFD; valid text is
/// returned unchanged.
BASE1_API string toValidUtf8(string_view text);

} // namespace base
