#include "i_file.h"

#include "b_log.h"

#include <charconv>
#include <cstdio>
#include <cstring>

/// Reads and writes pictures from a command line, for checks against other programs.
namespace {

using namespace iio;

constexpr char usage[] = "image_tool IN OUT [NAME=VALUE...]   writes OUT, by these attributes\n"
                         "image_tool --info IN   prints size, format and type, then a PAM\n";

/// `true` and `false`, whole numbers and texts.
void setAttribute(base::AttribMap& attributes, string_view setting) {
    const auto equals = setting.find('=');
    const string_view text = setting.substr(equals + 1);
    const base::name_id name = base::nameServer().id(setting.substr(0, equals));
    i32 number = 0;
    const auto parsed = std::from_chars(text.data(), text.data() + text.size(), number);
    if (text == "true" || text == "false")
        attributes.attribute<bool>(name) = text == "true";
    else if (!text.empty() && parsed.ptr == text.data() + text.size())
        attributes.attribute<i32>(name) = number;
    else
        attributes.attribute<string>(name) = string(text);
}

int convert(const char* from, const char* to, int settingCount, char** settings) {
    const ref<Image> image = loadImage(from);
    if (!image)
        return 1;
    base::AttribMap attributes;
    for (int i = 0; i < settingCount; ++i)
        setAttribute(attributes, settings[i]);
    return saveImage(*image, to, attributes) ? 0 : 1;
}

/// Components as a PAM has them: red first, two bytes with the high one first.
void writePamRow(const Image& image, u32 y) {
    const u32 channels = image.channelCount();
    const u32 bytes = componentBits(image.type()) / 8;
    const bool isSwapped = image.format() == Image::kBGR || image.format() == Image::kBGRA;
    for (u32 x = 0; x < image.width(); ++x) {
        for (u32 c = 0; c < channels; ++c) {
            const u32 from = isSwapped && c < 3 ? 2 - c : c;
            const u8* component = image.row(y) + (u64(x) * channels + from) * bytes;
            for (u32 byte = bytes; byte-- > 0;)
                std::putchar(component[byte]);
        }
    }
}

int describe(const char* path) {
    const ref<Image> image = loadImage(path);
    if (!image)
        return 1;
    const bool isShort = image->type() == Image::IT_UNSIGNED_SHORT;
    std::printf("%u %u %s %s\n", image->width(), image->height(), formatInfo(image->format()).name,
                typeName(image->type()));
    if (!isShort && image->type() != Image::IT_UNSIGNED_BYTE)
        return 0;
    static constexpr const char* tuples[] = {"GRAYSCALE", "GRAYSCALE_ALPHA", "RGB", "RGB_ALPHA"};
    const u32 channels = image->channelCount();
    std::printf("P7\nWIDTH %u\nHEIGHT %u\nDEPTH %u\nMAXVAL %u\nTUPLTYPE %s\nENDHDR\n",
                image->width(), image->height(), channels, isShort ? 65535u : 255u,
                tuples[channels - 1]);
    for (u32 y = 0; y < image->height(); ++y)
        writePamRow(*image, y);
    return 0;
}

} // namespace

int main(int argumentCount, char** arguments) {
    base::log().addOutput(base::ref<base::ICustomLog>(&base::console()));
    if (argumentCount == 3 && std::strcmp(arguments[1], "--info") == 0)
        return describe(arguments[2]);
    if (argumentCount >= 3 && arguments[1][0] != '-')
        return convert(arguments[1], arguments[2], argumentCount - 3, arguments + 3);
    std::fputs(usage, stderr);
    return 2;
}
