#pragma once

#include "i_component.h"
#include "i_image.h"

#include <algorithm>
#include <gtest/gtest.h>

/// Small pictures for tests.
namespace iio {

inline ref<Image> makeImage(u32 width, u32 height, u8 format, u8 type = Image::IT_UNSIGNED_BYTE,
                            u32 alignment = 1) {
    return base::makeRef<Image>(width, height, 1u, alignment, format, type);
}

/// Component `index` of those that lie one after the other in memory; blocks count as bytes.
inline void setComponent(Image& image, u64 index, double value) {
    dispatchType(std::max(image.type(), u8(1)), [&](auto component) {
        using T = decltype(component);
        T& target = reinterpret_cast<T*>(image.data())[index];
        if constexpr (std::is_same_v<T, half>)
            target = half(static_cast<float>(value));
        else
            target = static_cast<T>(value);
    });
}

inline double componentAt(const Image& image, u64 index) {
    double value = 0;
    dispatchType(std::max(image.type(), u8(1)), [&](auto component) {
        using T = decltype(component);
        const T stored = reinterpret_cast<const T*>(image.data())[index];
        if constexpr (std::is_same_v<T, half>)
            value = static_cast<float>(stored);
        else
            value = static_cast<double>(stored);
    });
    return value;
}

/// A picture that `components` fill.
inline ref<Image> imageOf(u32 width, u32 height, u8 format, u8 type,
                          std::initializer_list<double> components) {
    ref<Image> image = makeImage(width, height, format, type);
    const u32 size = std::max(componentBits(type) / 8, 1u);
    EXPECT_EQ(image->memorySize(), components.size() * size);
    for (u64 i = 0; i < components.size(); ++i)
        setComponent(*image, i, components.begin()[i]);
    return image;
}

/// The same of one row, as long as the components suffice for.
inline ref<Image> rowOf(u8 format, u8 type, std::initializer_list<double> components) {
    const auto width = static_cast<u32>(components.size()) / formatInfo(format).channelCount;
    return imageOf(width, 1, format, type, components);
}

inline vector<double> componentsOf(const Image& image) {
    vector<double> components(image.memorySize() / std::max(componentBits(image.type()) / 8, 1u));
    for (u64 i = 0; i < components.size(); ++i)
        components[i] = componentAt(image, i);
    return components;
}

inline vector<u8> bytesOf(const Image& image) {
    return vector<u8>(image.data(), image.data() + image.memorySize());
}

/// Fills with bytes that hardly repeat.
inline void fillWithNoise(Image& image) {
    u32 state = 12345;
    for (u64 i = 0; i < image.memorySize(); ++i) {
        state = state * 1664525 + 1013904223;
        image.data()[i] = static_cast<u8>(state >> 24);
    }
}

inline ref<Image> noiseImage(u32 width, u32 height, u8 format, u8 type, u32 alignment = 1) {
    ref<Image> image = makeImage(width, height, format, type, alignment);
    fillWithNoise(*image);
    return image;
}

} // namespace iio
