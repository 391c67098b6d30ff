#include "b_base64.h"

#include "b_containers.h"

#include <gtest/gtest.h>

namespace base {
namespace {

string encoded(string_view bytes) {
    // Of exactly the stated length, so that the address sanitizer sees a byte too many.
    const std::size_t length = base64Length(bytes.size());
    const auto in = std::make_unique<u8[]>(bytes.size());
    std::copy(bytes.begin(), bytes.end(), in.get());
    const auto out = std::make_unique<char[]>(length);
    base64Encode(in.get(), bytes.size(), out.get());
    return string(out.get(), length);
}

/// Reads one bit at a time, as the format's definition has it.
string decoded(string_view text) {
    string bits;
    for (const char c : text) {
        const int value = c >= 'A' && c <= 'Z'   ? c - 'A'
                          : c >= 'a' && c <= 'z' ? c - 'a' + 26
                          : c >= '0' && c <= '9' ? c - '0' + 52
                          : c == '+'             ? 62
                          : c == '/'             ? 63
                                                 : -1;
        for (int bit = 5; bit >= 0 && value >= 0; --bit)
            bits.push_back(static_cast<char>('0' + (value >> bit & 1)));
    }
    string bytes;
    for (std::size_t i = 0; i + 8 <= bits.size(); i += 8)
        bytes.push_back(static_cast<char>(std::stoi(bits.substr(i, 8), nullptr, 2)));
    return bytes;
}

TEST(Base64, GivesTheVectorsOfTheStandard) {
    const std::pair<string, string> rows[] = {
        {"", ""},
        {"f", "Zg=="},
        {"fo", "Zm8="},
        {"foo", "Zm9v"},
        {"foob", "Zm9vYg=="},
        {"fooba", "Zm9vYmE="},
        {"foobar", "Zm9vYmFy"},
    };
    for (const auto& [bytes, text] : rows)
        EXPECT_EQ(encoded(bytes), text);
}

TEST(Base64, ReadsBackAtEveryLength) {
    string bytes;
    u32 random = 1;
    for (int length = 0; length < 200; ++length) {
        const string text = encoded(bytes);
        EXPECT_EQ(decoded(text), bytes) << length;
        EXPECT_EQ(text.size() % 4, 0u) << length;
        const auto padding = static_cast<std::size_t>(std::count(text.begin(), text.end(), '='));
        EXPECT_EQ(padding, (3 - bytes.size() % 3) % 3) << length;
        random = random * 1664525 + 1013904223;
        bytes.push_back(static_cast<char>(random >> 24));
    }
}

TEST(Base64, UsesAllOfTheAlphabet) {
    string bits;
    for (int value = 0; value < 64; ++value) {
        for (int bit = 5; bit >= 0; --bit)
            bits.push_back(static_cast<char>('0' + (value >> bit & 1)));
    }
    string bytes;
    for (std::size_t i = 0; i < bits.size(); i += 8)
        bytes.push_back(static_cast<char>(std::stoi(bits.substr(i, 8), nullptr, 2)));
    EXPECT_EQ(encoded(bytes), "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/");
}

} // namespace
} // namespace base
