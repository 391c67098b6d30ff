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

TEST(Base64, GivesTheVectorsOfTheStandard) {
    using Row = std::pair<string, string>;
    const Row rows[] = {{"", ""},
                        {"f", "Zg=="},
                        {"fo", "Zm8="},
                        {"foo", "Zm9v"},
                        {"foob", "Zm9vYg=="},
                        {"fooba", "Zm9vYmE="},
                        {"foobar", "Zm9vYmFy"},
                        {"Many hands ma", "TWFueSBoYW5kcyBtYQ=="},
                        {"Many hands mak", "TWFueSBoYW5kcyBtYWs="},
                        {"Many hands make light work.", "TWFueSBoYW5kcyBtYWtlIGxpZ2h0IHdvcmsu"}};
    // The numbers from 0 to 63, of six bits each.
    const string all("\x00\x10\x83\x10\x51\x87\x20\x92\x8b\x30\xd3\x8f\x41\x14\x93\x51\x55\x97\x61"
                     "\x96\x9b\x71\xd7\x9f"
                     "\x82\x18\xa3\x92\x59\xa7\xa2\x9a\xab\xb2\xdb\xaf\xc3\x1c\xb3\xd3\x5d\xb7\xe3"
                     "\x9e\xbb\xf3\xdf\xbf",
                     48);
    EXPECT_EQ(encoded(all), "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/");
    for (const auto& [bytes, text] : rows)
        EXPECT_EQ(encoded(bytes), text);
}

} // namespace
} // namespace base
