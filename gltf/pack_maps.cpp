#include "gltf/pack_maps.h"

#include "i_grid_sampler.h"

#include <bit>
#include <limits>
#include <optional>

namespace gltf {

using base::u32;
using base::u8;
using iio::GridSampler;
using iio::Image;

namespace {

constexpr u32 red = 0, green = 1, blue = 2, alpha = 3;

/// What a map's code makes of a colour; not a number for an unknown code.
float channelValue(u8 colorChannels, const float (&color)[4]) {
    switch (colorChannels) {
    case 0:
        return color[alpha] * color[red];
    case 1:
    case 3:
        return color[red];
    case 2:
        return color[alpha];
    case 4:
        return color[green];
    case 5:
        return color[blue];
    case 6:
        return (color[green] + color[red] + color[blue]) * 0.33333334f;
    default:
        return std::numeric_limits<float>::quiet_NaN();
    }
}

u8 byteOf(float value) {
    return base::saturate<u8>(value * 255.0f);
}

/// The channels that a code reads, as bits.
u32 channelsOf(u8 colorChannels) {
    static constexpr u32 masks[] = {
        1u << alpha | 1u << red,
        1u << red,
        1u << alpha,
        1u << red,
        1u << green,
        1u << blue,
        1u << green | 1u << red | 1u << blue,
    };
    return colorChannels < std::size(masks) ? masks[colorChannels] : 0;
}

/// Writes one component of the packed picture, row by row.
class PackedChannel {
public:
    PackedChannel(const PackedMap& map, u32 width, u32 height)
        : colorChannels_(map.colorChannels), channels_(channelsOf(map.colorChannels)),
          width_(width) {
        if (!map.image || channels_ == 0)
            return;
        sampler_.emplace(*map.image, width, height);
        makeTable(*map.image);
    }

    /// `out` is the first of the row's components, the others follow in steps of three.
    void writeRow(u32 y, u8* out) {
        if (!sampler_)
            return writeValues(out, [](u32) { return u8(0); });
        if (hasTable_) {
            if (const GridSampler::StoredRow row = sampler_->storedRow(tableChannel_, y); row.first)
                return writeValues(out, [&](u32 x) { return table_[row.first[x * row.step]]; });
        }
        const float* rows[4] = {};
        for (u32 channel = 0; channel < 4; ++channel) {
            if ((channels_ >> channel & 1) != 0)
                rows[channel] = sampler_->row(channel, y);
        }
        if (const float* only = onlyRow(rows))
            return writeValues(out, [&](u32 x) { return byteOf(only[x]); });
        writeValues(out, [&](u32 x) {
            float color[4] = {};
            for (u32 channel = 0; channel < 4; ++channel)
                color[channel] = rows[channel] ? rows[channel][x] : 0.0f;
            return byteOf(channelValue(colorChannels_, color));
        });
    }

private:
    /// The results for all bytes, where they follow from one component of the picture.
    void makeTable(const Image& image) {
        const bool isGrey = image.channelCount() == 1;
        const bool isSingle = std::has_single_bit(channels_);
        const bool isOpaqueRed = colorChannels_ == 0 && !image.hasAlpha();
        if (!isGrey && !isSingle && !isOpaqueRed)
            return;
        hasTable_ = true;
        if (!isGrey && isSingle)
            tableChannel_ = static_cast<u32>(std::countr_zero(channels_));
        for (u32 byte = 0; byte < 256; ++byte) {
            const float value = static_cast<float>(byte) / 255.0f;
            const float opacity = isGrey || isSingle ? value : 1.0f;
            table_[byte] = byteOf(channelValue(colorChannels_, {value, value, value, opacity}));
        }
    }

    const float* onlyRow(const float* (&rows)[4]) const {
        return std::has_single_bit(channels_) ? rows[std::countr_zero(channels_)] : nullptr;
    }

    template <class Value>
    void writeValues(u8* out, const Value& valueAt) const {
        for (u32 x = 0; x < width_; ++x, out += 3)
            *out = valueAt(x);
    }

    u8 colorChannels_;
    u32 channels_;
    u32 width_;
    std::optional<GridSampler> sampler_;
    bool hasTable_ = false;
    u32 tableChannel_ = red;
    std::array<u8, 256> table_{};
};

} // namespace

base::ref<Image> packMaps(const std::array<PackedMap, 3>& redGreenBlue, u32 width, u32 height) {
    auto packed = base::makeRef<Image>();
    packed->create(width, height, 1, 1, Image::kRGB, Image::IT_UNSIGNED_BYTE);
    if (!packed->data())
        return nullptr;
    PackedChannel channels[] = {{redGreenBlue[0], width, height},
                                {redGreenBlue[1], width, height},
                                {redGreenBlue[2], width, height}};
    for (u32 y = 0; y < height; ++y) {
        u8* row = packed->row(y);
        for (PackedChannel& channel : channels)
            channel.writeRow(y, row++);
    }
    return packed;
}

base::ref<Image> makeSamplable(base::ref<Image> image) {
    if (GridSampler::canSample(*image))
        return image;
    image = image->convertFormat(Image::kRGBA);
    return image ? image->convertType(Image::IT_UNSIGNED_BYTE, 0, Image::gammaNone) : nullptr;
}

} // namespace gltf
