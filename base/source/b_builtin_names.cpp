#include "b_builtin_names.h"

#include "b_log.h"
#include "b_type_traits.h"

#include <array>

namespace base {

namespace {

#define BASE_SCALAR_TEXT_ROW(T, text) text,
#define BASE_ARRAY_TEXT_ROW(T, text) text "[]",
constexpr std::string_view texts[] = {
    // The name without characters
    "",
    // Value types
    BASE_FULL_TYPES(BASE_SCALAR_TEXT_ROW) BASE_SCALAR_TYPES(BASE_SCALAR_TEXT_ROW)
        BASE_FULL_TYPES(BASE_ARRAY_TEXT_ROW) BASE_ARRAY_TYPES(BASE_ARRAY_TEXT_ROW)
    // Structural types
    "map",
    "array", "link",
    // Log channels
    "All", "System", "Scene", "IO"};

constexpr std::size_t indexOf(std::string_view text) {
    std::size_t i = 0;
    while (texts[i] != text)
        ++i;
    return i;
}

constexpr bool areUnique() {
    for (std::size_t i = 0; i < std::size(texts); ++i)
        if (indexOf(texts[i]) != i)
            return false;
    return true;
}
static_assert(areUnique());

constexpr auto makeRecords() {
    std::array<NameRecord, std::size(texts)> made{};
    for (std::size_t i = 0; i < made.size(); ++i) {
        made[i].chars = texts[i].data();
        made[i].length = static_cast<u32>(texts[i].size());
        made[i].hash = nameHash(texts[i]);
    }
    return made;
}

constinit std::array<NameRecord, std::size(texts)> records = makeRecords();

consteval name_id builtin(std::string_view text) {
    return name_id(&records[indexOf(text)]);
}

} // namespace

std::span<const NameRecord> builtinNames() noexcept {
    return records;
}

constinit const name_id emptyBuiltinName = builtin("");

#define BASE_DEFINE_SCALAR_NAME(T, text) \
    constinit const name_id TypeTraits<T>::n_name = builtin(text);
#define BASE_DEFINE_ARRAY_NAME(T, text) \
    constinit const name_id TypeTraits<T>::n_array_name = builtin(text "[]");
BASE_FULL_TYPES(BASE_DEFINE_SCALAR_NAME)
BASE_SCALAR_TYPES(BASE_DEFINE_SCALAR_NAME)
BASE_FULL_TYPES(BASE_DEFINE_ARRAY_NAME)
BASE_ARRAY_TYPES(BASE_DEFINE_ARRAY_NAME)

constinit const name_id n_map = builtin("map");
constinit const name_id n_array = builtin("array");
constinit const name_id n_link = builtin("link");

constinit const name_id logAll = builtin("All");
constinit const name_id logSystem = builtin("System");
constinit const name_id logScene = builtin("Scene");
constinit const name_id logIO = builtin("IO");

} // namespace base
