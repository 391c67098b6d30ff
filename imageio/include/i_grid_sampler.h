#pragma once

#include "i_image.h"

namespace iio {

/// Samples a picture at the centres of a grid of another size, a row at a time: the same numbers
/// as a `Sampler` with linear filter gives at ((x + 0.5) / width, (y + 0.5) / height) where the
/// picture repeats, without what each lookup costs there.
///
/// Borrows the picture. Keeps the rows at work, so that one object serves one thread; it is fast
/// where rows are asked for in order.
class GridSampler {
public:
    /// Whether the picture has pixels, is no cube map, and is made of 8-bit, unsigned 16-bit, half
    /// or float components.
    static bool canSample(const Image& image);
    /// Throws `base::switch_exception` for a picture that can't be sampled.
    GridSampler(const Image& image, u32 width, u32 height);

    /// Component `channel` of 0..3 (red, green, blue, alpha) along row `y` < height. Grey pictures
    /// have their value in all four. Valid until the next call for that channel.
    const float* row(u32 channel, u32 y);

    /// Components of a row that is stored where the grid has it.
    struct StoredRow {
        const u8* first = nullptr; ///< null if there is no such row
        u32 step = 0;              ///< from one pixel to the next
    };
    /// The same row as it is stored, for pictures of unsigned bytes whose pixels lie exactly at
    /// the points of the grid; none for a channel that the format lacks.
    StoredRow storedRow(u32 channel, u32 y) const;

private:
    /// Where the points of the grid lie along one axis: between two pixels each.
    struct Axis {
        Axis(u32 gridSize, u32 pictureSize);

        vector<u32> first, second;
        vector<float> fraction;
        bool isOnPixels = true; ///< all fractions are 0
    };
    /// Rows of the picture, sampled along x, that the last row of the grid was made of.
    struct Channel {
        vector<float> mixed[2];
        i64 source[2] = {-1, -1};
        vector<float> result;
    };

    const float* mixedRow(Channel& state, u32 channel, u32 sourceRow, u32 keptRow);
    void readRow(u32 channel, u32 sourceRow, float* out) const;

    const Image& image_;
    Axis columns_, rows_;
    bool isInteger_;
    vector<float> pixels_; ///< one row of the picture
    Channel channels_[4];
};

} // namespace iio
