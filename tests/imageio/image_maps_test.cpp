#include "i_image_algo.h"
#include "i_plugin.h"
#include "log_capture.h"

#include "stream/b_fs.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <cstring>
#include <gtest/gtest.h>

namespace iio {
namespace {

using test_support::LogCapture;

ref<Image> makeGrey(u32 width, u32 height, std::initializer_list<u8> values) {
    auto image =
        base::makeRef<Image>(width, height, 1u, 1u, u8(Image::kRed), u8(Image::IT_UNSIGNED_BYTE));
    std::copy(values.begin(), values.end(), image->data());
    return image;
}

std::array<int, 3> pixelOf(const Image& map, u32 x, u32 y) {
    const u8* pixel = map.row(y) + 3 * x;
    return {pixel[0], pixel[1], pixel[2]};
}

TEST(NormalMap, FlatIsStraightUp) {
    for (const u8 height : {u8(0), u8(77), u8(255)}) {
        const auto map = makeNormalMap(*makeGrey(3, 1, {height, height, height}), 0, 5, false);
        ASSERT_TRUE(map);
        EXPECT_EQ(map->format(), Image::kRGB);
        EXPECT_EQ(map->byteAlignment(), 1U);
        for (u32 x = 0; x < 3; ++x)
            EXPECT_EQ(pixelOf(*map, x, 0), (std::array{128, 128, 254}));
    }
}

TEST(NormalMap, LeansAgainstTheSlope) {
    // Rows alike: dx is four times the difference of the columns beside. Columns 0, 51, 0, 0, so at
    // column 0 0.8 x strength. Strength 0.5: dx = 0.4, s = 0.16; nx = -0.4 / sqrt(1.16) = -0.37139;
    // red 127 nx + 128 = 80.8; blue (sqrt(0.84) + 1.007874) x 127 = 244.4. By hand.
    const auto image = makeGrey(4, 3, {0, 51, 0, 0, 0, 51, 0, 0, 0, 51, 0, 0});
    const auto map = makeNormalMap(*image, 0, 0.5f, false);
    EXPECT_EQ(pixelOf(*map, 0, 1), (std::array{80, 128, 244}));
    EXPECT_EQ(pixelOf(*map, 1, 1), (std::array{128, 128, 254}));
    EXPECT_EQ(pixelOf(*map, 2, 1), (std::array{175, 128, 244}));
    EXPECT_EQ(pixelOf(*map, 3, 2), (std::array{128, 128, 254}));
    // The other way round.
    const auto inverted = makeNormalMap(*image, 0, 0.5f, true);
    EXPECT_EQ(pixelOf(*inverted, 0, 1), (std::array{175, 128, 244}));
    EXPECT_EQ(pixelOf(*inverted, 2, 1), (std::array{80, 128, 244}));
    // The picture turned: row 1 is high. Above it the ground rises downwards: green is less.
    const auto turned = makeGrey(3, 4, {0, 0, 0, 51, 51, 51, 0, 0, 0, 0, 0, 0});
    const auto turnedMap = makeNormalMap(*turned, 0, 0.5f, false);
    EXPECT_EQ(pixelOf(*turnedMap, 1, 0), (std::array{128, 80, 244}));
    EXPECT_EQ(pixelOf(*turnedMap, 1, 2), (std::array{128, 175, 244}));
    // It tiles: the last row lies above the first, where the ground is flat.
    EXPECT_EQ(pixelOf(*turnedMap, 1, 3), (std::array{128, 128, 254}));
}

TEST(NormalMap, SteepSlopesHaveNoBlue) {
    // dx = 4: nx = -4 / sqrt(17) = -0.97014; red 4.79.
    const auto image = makeGrey(4, 1, {0, 255, 0, 0});
    EXPECT_EQ(pixelOf(*makeNormalMap(*image, 0, 1, false), 0, 0), (std::array{4, 128, 0}));
}

TEST(NormalMap, ReadsTheChannel) {
    Image image(4, 1, 1, 1, Image::kRGBA, Image::IT_UNSIGNED_BYTE);
    const u8 pixels[] = {9, 0, 0, 0, 9, 51, 0, 0, 9, 0, 0, 51, 9, 0, 0, 0};
    std::memcpy(image.data(), pixels, sizeof(pixels));
    EXPECT_EQ(pixelOf(*makeNormalMap(image, 0, 0.5f, false), 0, 0), (std::array{128, 128, 254}));
    EXPECT_EQ(pixelOf(*makeNormalMap(image, 1, 0.5f, false), 0, 0), (std::array{80, 128, 244}));
    EXPECT_EQ(pixelOf(*makeNormalMap(image, 3, 0.5f, false), 1, 0), (std::array{80, 128, 244}));
    LogCapture log;
    EXPECT_EQ(makeNormalMap(Image(), 0, 1, false), nullptr);
    EXPECT_EQ(log.entries().size(), 1U);
}

/// Six faces of 2 x 2 that hold their numbers.
std::array<ref<Image>, 6> makeFaces() {
    std::array<ref<Image>, 6> faces;
    for (u8 n = 0; n < 6; ++n) {
        faces[n] = makeGrey(2, 2, {n, n, n, n});
        *faces[n]->level(1, true) = *makeGrey(1, 1, {u8(n + 10)});
    }
    return faces;
}

ref<Image> joined(const std::array<ref<Image>, 6>& faces) {
    return createCubemap(faces[0], faces[1], faces[2], faces[3], faces[4], faces[5]);
}

TEST(Cubemap, JoinsSixFaces) {
    const auto cube = joined(makeFaces());
    ASSERT_TRUE(cube);
    EXPECT_EQ(cube->kind(), Image::kindCube);
    ASSERT_NE(cube->level(1), nullptr);
    for (u8 n = 0; n < 6; ++n) {
        EXPECT_EQ(cube->face(n)[3], n);
        EXPECT_EQ(cube->level(1)->face(n)[0], n + 10);
    }
}

TEST(Cubemap, RefusesWhatDoesNotFit) {
    const auto make = [](u32 width, u32 height, u8 format, u8 type, u32 alignment) {
        return base::makeRef<Image>(width, height, 1u, alignment, format, type);
    };
    struct Row {
        u32 face;
        ref<Image> image;
        const char* message;
    };
    const char* invalid =
        "one or more image is invalid (could be nullptr, not allocated, not 2D,wrong internal "
        "configuration, etc).";
    const Row rows[] = {
        {0, {}, invalid},
        {5, base::makeRef<Image>(), invalid},
        {3, make(2, 1, Image::kRed, 1, 1), invalid},
        {0, make(3, 2, Image::kRed, 1, 1), "all the images must be square."},
        {4, make(3, 2, Image::kRed, 1, 1),
         "the faces of the cube must have the very same dimensions."},
        {1, make(2, 2, Image::kGreen, 1, 1),
         "the faces of the cube must have the very same format."},
        {5, make(2, 2, Image::kRed, 2, 1), "the faces of the cube must have the very same type."},
        {2, make(2, 2, Image::kRed, 1, 2),
         "the faces of the cube must have the very same byte alignment."},
    };
    for (const Row& row : rows) {
        auto faces = makeFaces();
        faces[row.face] = row.image;
        LogCapture log;
        EXPECT_EQ(joined(faces), nullptr);
        EXPECT_TRUE(log.has(base::logError, string("Cubemap creation failed: ") + row.message))
            << row.message << linesOf(log);
    }
}

TEST(Cubemap, FindsTheFilesOfTheFaces) {
    const string folder = testing::TempDir() + "cubemap faces/";
    base::fs::master().mkdir(folder);
    struct Row {
        const char* names[6];
    };
    const Row rows[] = {
        {{"posx_posx.tga", "posx_negx.tga", "posx_posy.tga", "posx_negy.tga", "posx_posz.tga",
          "posx_negz.tga"}},
        {{"axpos.tga", "axneg.tga", "aypos.tga", "ayneg.tga", "azpos.tga", "azneg.tga"}},
        {{"desktop_right.tga", "desktop_left.tga", "desktop_up.tga", "desktop_bottom.tga",
          "desktop_forward.tga", "desktop_back.tga"}},
        {{"s_rt.tga", "s_lf.tga", "s_up.tga", "s_dn.tga", "s_ft.tga", "s_bk.tga"}},
        {{"qpx.tga", "qnx.tga", "qpy.tga", "qny.tga", "qpz.tga", "qnz.tga"}},
    };
    for (const Row& row : rows) {
        for (u8 n = 0; n < 6; ++n)
            ASSERT_TRUE(saveImage(*makeGrey(2, 2, {n, n, n, n}), folder + row.names[n]));
        for (const char* name : row.names) {
            LogCapture log;
            const auto cube = loadCubemap(folder + name);
            ASSERT_TRUE(cube) << name << linesOf(log);
            for (u8 n = 0; n < 6; ++n)
                EXPECT_EQ(cube->face(n)[0], n) << name;
        }
    }
    LogCapture log;
    EXPECT_EQ(loadCubemap(folder + "plain.tga"), nullptr);
    EXPECT_TRUE(
        log.has(base::logInformation, "Unrecognized cubemap format '" + folder + "plain.tga'!"));
    base::fs::master().remove(folder + "s_dn.tga");
    EXPECT_EQ(loadCubemap(folder + "s_rt.tga"), nullptr);
    EXPECT_TRUE(
        log.has(base::logInformation, "Cubemap subimage '" + folder + "s_dn.tga' not found!"));
}

} // namespace
} // namespace iio
