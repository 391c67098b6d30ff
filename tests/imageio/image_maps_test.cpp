#include "i_cubemap.h"
#include "i_file.h"
#include "i_normal_map.h"
#include "log_capture.h"
#include "picture_builder.h"
#include "temp_folder.h"

#include "stream/b_fs.h"

#include <algorithm>
#include <array>

namespace iio {
namespace {

using test_support::LogCapture;

TEST(NormalMap, LeansAgainstTheSlope) {
    // Rows alike: dx is four times the difference of the columns beside. Columns 0, 51, 0, 0, so at
    // column 0 0.8 x strength. Strength 0.5: dx = 0.4, s = 0.16; nx = -0.4 / sqrt(1.16) = -0.37139;
    // red 127 nx + 128 = 80.8; blue (sqrt(0.84) + 1.007874) x 127 = 244.4. By hand.
    const auto columns = imageOf(4, 3, Image::kRed, 1, {0, 51, 0, 0, 0, 51, 0, 0, 0, 51, 0, 0});
    // Above row 1 the ground rises downwards. It tiles: the last row lies above the first.
    const auto rowsAlike = imageOf(3, 4, Image::kRed, 1, {0, 0, 0, 51, 51, 51, 0, 0, 0, 0, 0, 0});
    const auto flat = rowOf(Image::kRed, 1, {77, 77, 77});
    // dx = 4: nx = -4 / sqrt(17) = -0.97014; red 4.79.
    const auto steep = rowOf(Image::kRed, 1, {0, 255, 0, 0});
    const auto channels =
        rowOf(Image::kRGBA, 1, {9, 0, 0, 0, 9, 51, 0, 0, 9, 0, 0, 51, 9, 0, 0, 0});
    struct Row {
        const Image& heights;
        u32 channel;
        float strength;
        bool inverts;
        u32 x, y;
        std::array<int, 3> normal;
    };
    const std::array up = {128, 128, 254};
    const Row rows[] = {
        {*flat, 0, 5, false, 0, 0, up},
        {*columns, 0, 0.5f, false, 0, 1, {80, 128, 244}},
        {*columns, 0, 0.5f, false, 1, 1, up},
        {*columns, 0, 0.5f, false, 2, 1, {175, 128, 244}},
        {*columns, 0, 0.5f, false, 3, 2, up},
        {*columns, 0, 0.5f, true, 0, 1, {175, 128, 244}},
        {*columns, 0, 0.5f, true, 2, 1, {80, 128, 244}},
        {*rowsAlike, 0, 0.5f, false, 1, 0, {128, 80, 244}},
        {*rowsAlike, 0, 0.5f, false, 1, 2, {128, 175, 244}},
        {*rowsAlike, 0, 0.5f, false, 1, 3, up},
        {*steep, 0, 1, false, 0, 0, {4, 128, 0}},
        {*channels, 0, 0.5f, false, 0, 0, up},
        {*channels, 1, 0.5f, false, 0, 0, {80, 128, 244}},
        {*channels, 3, 0.5f, false, 1, 0, {80, 128, 244}},
    };
    for (const Row& row : rows) {
        const auto map = makeNormalMap(row.heights, row.channel, row.strength, row.inverts);
        ASSERT_TRUE(map);
        EXPECT_EQ(map->format(), Image::kRGB);
        EXPECT_EQ(map->byteAlignment(), 1U);
        const u8* pixel = map->row(row.y) + 3 * row.x;
        EXPECT_EQ((std::array<int, 3>{pixel[0], pixel[1], pixel[2]}), row.normal) << &row - rows;
    }
    LogCapture log;
    EXPECT_EQ(makeNormalMap(Image(), 0, 1, false), nullptr);
    EXPECT_EQ(log.entries().size(), 1U);
}

/// A grey square.
ref<Image> makeGrey(u32 side, u8 value) {
    ref<Image> image = makeImage(side, side, Image::kRed);
    std::fill_n(image->data(), image->memorySize(), value);
    return image;
}

/// Six faces of 2 x 2 that hold their numbers.
std::array<ref<Image>, 6> makeFaces() {
    std::array<ref<Image>, 6> faces;
    for (u8 n = 0; n < 6; ++n) {
        faces[n] = makeGrey(2, n);
        *faces[n]->level(1, true) = *makeGrey(1, u8(n + 10));
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
        {3, makeImage(2, 1, Image::kRed), invalid},
        {0, makeImage(3, 2, Image::kRed), "all the images must be square."},
        {4, makeImage(3, 2, Image::kRed),
         "the faces of the cube must have the very same dimensions."},
        {1, makeImage(2, 2, Image::kGreen),
         "the faces of the cube must have the very same format."},
        {5, makeImage(2, 2, Image::kRed, 2), "the faces of the cube must have the very same type."},
        {2, makeImage(2, 2, Image::kRed, 1, 2),
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
    const test_support::TempFolder home;
    const string folder = home / "cubemap faces/";
    base::fs::master().mkdir(folder);
    struct Row {
        const char* names[6];
    };
    const Row rows[] = {
        {{"posx_posx.tga", "posx_negx.tga", "posx_posy.tga", "posx_negy.tga", "posx_posz.tga",
          "posx_negz.tga"}},
        {{"desktop_right.tga", "desktop_left.tga", "desktop_up.tga", "desktop_bottom.tga",
          "desktop_forward.tga", "desktop_back.tga"}},
    };
    for (const Row& row : rows) {
        for (u8 n = 0; n < 6; ++n)
            ASSERT_TRUE(saveImage(*makeGrey(2, n), folder + row.names[n]));
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
    base::fs::master().remove(folder + "desktop_bottom.tga");
    EXPECT_EQ(loadCubemap(folder + "desktop_right.tga"), nullptr);
    EXPECT_TRUE(log.has(base::logInformation,
                        "Cubemap subimage '" + folder + "desktop_bottom.tga' not found!"));
}

} // namespace
} // namespace iio
