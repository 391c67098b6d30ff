#include "b_containers.h"

#include <gtest/gtest.h>
#include <numeric>
#include <random>
#include <stdexcept>
#include <vector>

namespace base {
namespace {

template <class T>
std::vector<T> contents(const vector<T>& v) {
    return std::vector<T>(v.begin(), v.end());
}

TEST(Vector, MutatingAViewLeavesTheForeignMemoryAlone) {
    using Mutation = void (*)(vector<int>&);
    struct Case {
        const char* what;
        Mutation mutate;
        std::vector<int> expected;
    };
    const Case cases[] = {
        {"data", [](vector<int>& v) { *v.data() = 9; }, {9, 2, 3}},
        {"begin", [](vector<int>& v) { *v.begin() = 9; }, {9, 2, 3}},
        {"end", [](vector<int>& v) { v.end()[-1] = 9; }, {1, 2, 9}},
        {"operator[]", [](vector<int>& v) { v[1] = 9; }, {1, 9, 3}},
        {"front", [](vector<int>& v) { v.front() = 9; }, {9, 2, 3}},
        {"back", [](vector<int>& v) { v.back() = 9; }, {1, 2, 9}},
        {"push_back", [](vector<int>& v) { v.push_back(4); }, {1, 2, 3, 4}},
        {"pop_back", [](vector<int>& v) { v.pop_back(); }, {1, 2}},
        {"resize up", [](vector<int>& v) { v.resize(5); }, {1, 2, 3, 0, 0}},
        {"resize down", [](vector<int>& v) { v.resize(1); }, {1}},
        {"resize with own", [](vector<int>& v) { v.resize(4, std::as_const(v)[2]); }, {1, 2, 3, 3}},
        {"reserve", [](vector<int>& v) { v.reserve(2), v[0] = 9; }, {9, 2, 3}},
        {"erase", [](vector<int>& v) { v.erase(v.cbegin()); }, {2, 3}},
        {"insert", [](vector<int>& v) { v.insert(v.cbegin() + 1, 9); }, {1, 9, 2, 3}},
        {"assign",
         [](vector<int>& v) {
             v = {7, 8};
         },
         {7, 8}},
        {"clear", [](vector<int>& v) { v.clear(); }, {}}};
    for (const Case& c : cases) {
        const std::vector<int> foreign = {1, 2, 3};
        vector<int> v = vector<int>::view(foreign.data(), foreign.size());
        EXPECT_EQ(std::as_const(v).data(), foreign.data()) << c.what;
        c.mutate(v);
        EXPECT_EQ(contents(v), c.expected) << c.what;
        EXPECT_FALSE(v.isView()) << c.what;
        EXPECT_EQ(foreign, (std::vector<int>{1, 2, 3})) << c.what;
    }
}

TEST(Vector, OddViewRanges) {
    const int foreign[] = {1, 2, 3};
    vector<int> v = {5, 6};
    v.setView(foreign + 2, foreign);
    EXPECT_TRUE(v.empty());
    EXPECT_EQ(v.begin(), v.end());
    v.setView(foreign + 1, foreign + 1);
    EXPECT_TRUE(v.empty());
    EXPECT_FALSE(v.isView());

    // Two ints that start one byte behind an aligned address
    alignas(int) unsigned char bytes[3 * sizeof(int)] = {};
    const int values[] = {258, -2};
    std::memcpy(bytes + 1, values, sizeof values);
    const auto* first = reinterpret_cast<const int*>(bytes + 1);
    v = vector<int>::view(first, 2);
    EXPECT_FALSE(v.isView());
    EXPECT_EQ(contents(v), (std::vector<int>{258, -2}));
}

TEST(Vector, BehavesAsTheStandardOne) {
    std::mt19937 random(7);
    const auto upTo = [&](int most) { return static_cast<int>(random() % (unsigned(most) + 1)); };
    vector<string> v;
    std::vector<string> model;
    for (int step = 0; step < 20000; ++step) {
        const auto size = static_cast<int>(model.size());
        const int at = upTo(size);
        const int end = at + upTo(size - at);
        const string text =
            "an element longer than what a string holds in place " + std::to_string(step);
        const auto both = [&](auto change) { change(v), change(model); };
        switch (random() % 9) {
        case 0:
            both([&](auto& c) { c.insert(c.cbegin() + at, text); });
            break;
        case 1:
            both([&](auto& c) { c.resize(std::size_t(at)); });
            break;
        case 2:
            both([&](auto& c) { c.resize(std::size_t(at + 3), text); });
            break;
        case 3:
            both([&](auto& c) { c.erase(c.cbegin() + at, c.cbegin() + end); });
            break;
        case 4:
            if (!model.empty())
                both([&](auto& c) { c.push_back(c[0]); });
            break;
        case 5: {
            const vector<string> copy = v;
            const auto eighth = copy.begin() + copy.size() / 8;
            v.append(copy.begin(), eighth);
            model.insert(model.end(), copy.begin(), eighth);
            break;
        }
        default:
            both([&](auto& c) { c.push_back(text); });
        }
        ASSERT_EQ(v.size(), model.size()) << "step " << step;
        ASSERT_TRUE(std::equal(model.begin(), model.end(), v.cbegin())) << "step " << step;
        ASSERT_LE(v.size(), v.capacity());
    }
}

/// Throws when the fuse of copies has burnt down; counts the living.
struct Fragile {
    static inline int fuse = 0, living = 0;
    Fragile() { ++living; }
    Fragile(const Fragile&) {
        if (--fuse < 0)
            throw std::runtime_error("copy");
        ++living;
    }
    Fragile(Fragile&&) noexcept { ++living; }
    Fragile& operator=(const Fragile&) = default;
    ~Fragile() { --living; }
};

TEST(Vector, ThrowingCopiesLoseNothing) {
    {
        vector<Fragile> v(5);
        const Fragile extra;
        Fragile::fuse = 2;
        EXPECT_THROW(vector<Fragile>{v}, std::runtime_error);
        Fragile::fuse = 2;
        EXPECT_THROW(v.resize(50, extra), std::runtime_error);
        EXPECT_EQ(v.size(), 5u);
        Fragile::fuse = 0;
        EXPECT_THROW(v.push_back(extra), std::runtime_error);
        EXPECT_EQ(v.size(), 5u);
        EXPECT_EQ(Fragile::living, 6);
    }
    EXPECT_EQ(Fragile::living, 0);
}

TEST(FlatMap, BehavesAsTheStandardMap) {
    std::mt19937 random(11);
    flat_map<string, int> flat;
    std::map<string, int> model;
    for (int step = 0; step < 5000; ++step) {
        const string key = std::to_string(random() % 60);
        if (random() % 3 == 0) {
            ASSERT_EQ(flat.erase(key), model.erase(key) == 1);
        } else {
            flat[key] += step;
            model[key] += step;
        }
        const string other = std::to_string(random() % 60);
        const auto expected = model.find(other);
        const int* found = flat.get(other);
        ASSERT_EQ(found != nullptr, expected != model.end());
        ASSERT_EQ(flat.contains(other), found != nullptr);
        if (found) {
            ASSERT_EQ(*found, expected->second);
        }
        ASSERT_TRUE(std::equal(model.begin(), model.end(), std::as_const(flat).begin(),
                               std::as_const(flat).end(), [](const auto& a, const auto& b) {
                                   return a.first == b.first && a.second == b.second;
                               }));
    }
}

} // namespace
} // namespace base
