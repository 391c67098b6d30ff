#pragma once

#include "b_attribute_json.h"
#include "b_exception.h"

namespace base {

/// Calls `visit` with a null pointer to the C++ type that `type` stands for.
template <class Visit>
auto withNumberType(NumberType type, Visit&& visit) {
    switch (type) {
    case NumberType::int8:
        return visit(static_cast<i8*>(nullptr));
    case NumberType::uint8:
        return visit(static_cast<u8*>(nullptr));
    case NumberType::int16:
        return visit(static_cast<i16*>(nullptr));
    case NumberType::uint16:
        return visit(static_cast<u16*>(nullptr));
    case NumberType::int32:
        return visit(static_cast<i32*>(nullptr));
    case NumberType::uint32:
        return visit(static_cast<u32*>(nullptr));
    case NumberType::int64:
        return visit(static_cast<i64*>(nullptr));
    case NumberType::real32:
        return visit(static_cast<float*>(nullptr));
    case NumberType::real64:
        return visit(static_cast<double*>(nullptr));
    }
    throw switch_exception("b_number_type", "base::withNumberType", __LINE__);
}

} // namespace base
