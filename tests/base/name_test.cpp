#include "b_log.h"
#include "b_name.h"
#include "b_type_traits.h"

#include <cstdlib>
#include <gtest/gtest.h>
#include <string>
#include <vector>

namespace base {
namespace {

// Read while this program's static objects are being made.
const name_id earlyChannel = logSystem;
const name_id earlyType = TypeTraits<vec3f>::n_array_name;

TEST(Names, BuiltinHandlesAreTheNamesOfTheirTexts) {
    const std::pair<name_id, const char*> cases[] = {
        {earlyChannel, "System"},
        {earlyType, "vec3f[]"},
        {n_map, "map"},
        {TypeTraits<base_mat44<double>>::n_array_name, "mat44d[]"},
        {TypeTraits<base_box<vec3d>>::n_name, "box3d"},
        {TypeTraits<ref<IPlugin>>::n_name, "plugin"}};
    for (const auto& [handle, text] : cases) {
        EXPECT_EQ(handle.view(), text);
        EXPECT_EQ(nameServer().id(text), handle) << text;
        EXPECT_EQ(nameServer().find(text), handle) << text;
    }
}

TEST(Names, AbsentAndEmptyAreTwoThings) {
    NameServer& server = nameServer();
    EXPECT_EQ(server.id(""), server.emptyName());
    EXPECT_EQ(server.id(std::string_view("\0x", 2)), server.emptyName());
    EXPECT_FALSE(server.emptyName() == name_id());
    EXPECT_TRUE(server.emptyName() && server.emptyName().isEmpty());
    EXPECT_TRUE(!name_id() && name_id().isEmpty());
    EXPECT_STREQ(name_id().text(), "");
}

TEST(Names, FindMakesNothingAndATextEndsAtItsZero) {
    EXPECT_FALSE(nameServer().find("name test: nobody made this"));
    EXPECT_FALSE(nameServer().find("name test: nobody made this"));
    const name_id made = nameServer().id(std::string_view("name test: cut\0tail", 19));
    EXPECT_STREQ(made.text(), "name test: cut");
    EXPECT_EQ(nameServer().find("name test: cut"), made);
}

TEST(Names, ManyNamesStayApartInTheOrderOfInterning) {
    constexpr int count = 100000;
    std::vector<name_id> made;
    for (int i = 0; i < count; ++i)
        made.push_back(nameServer().id("many/" + std::to_string(i)));
    for (int i = 0; i < count; ++i) {
        const std::string text = "many/" + std::to_string(i);
        const name_id name = made[static_cast<std::size_t>(i)];
        ASSERT_EQ(name.view(), text);
        ASSERT_EQ(nameServer().id(text), name);
        ASSERT_EQ(name.record()->extra, nullptr);
        if (i > 0) {
            ASSERT_TRUE(made[static_cast<std::size_t>(i) - 1] < name);
        }
    }
    EXPECT_EQ(nameServer().id("map"), n_map);
}

/// True if names that fill the reserved range twice all keep their texts and handles.
bool fillTheRangeTwice() {
    constexpr int count = 40000;
    const std::string tail(3900, 'x');
    std::vector<name_id> made;
    for (int i = 0; i < count; ++i)
        made.push_back(nameServer().id(std::to_string(i) + tail));
    for (int i = 0; i < count; ++i) {
        const std::string text = std::to_string(i) + tail;
        const name_id name = made[static_cast<std::size_t>(i)];
        if (name.view() != text || nameServer().find(text) != name)
            return false;
    }
    return true;
}

// In a process of its own, since names are never freed.
TEST(NamesDeathTest, GoOnWhenTheReservedRangeIsFull) {
    EXPECT_EXIT(std::exit(fillTheRangeTwice() ? 0 : 1), testing::ExitedWithCode(0), "");
}

TEST(Names, LongTextsKeepTheOrder) {
    const std::string longText(std::size_t{65} << 20, 'y'); // more than the reserved range
    const name_id before = nameServer().id("long/before");
    const name_id middle = nameServer().id(longText);
    const name_id after = nameServer().id("long/after");
    EXPECT_TRUE(middle.view() == longText);
    EXPECT_EQ(nameServer().id(longText), middle);
    EXPECT_TRUE(before < middle && middle < after);
}

} // namespace
} // namespace base
