#include "i_component.h"
#include "i_operation.h"
#include "i_resize_kernel.h"

#include "b_log.h"

#include <algorithm>
#include <cstring>
#include <optional>

// Both passes run in one sweep over the target rows: the source rows that a target row needs are
// resampled in width, four at a time, and kept as long as later target rows may need them. What
// the width pass makes is stored in the picture's own type for a moment, since that is where its
// rounding comes from.

namespace iio {

namespace {

constexpr u32 rowsAtOnce = 4;
/// One component of `rowsAtOnce` rows.
typedef float Lanes __attribute__((vector_size(16)));
static_assert(sizeof(Lanes) == rowsAtOnce * sizeof(float));

Lanes load(const float* values) {
    Lanes lanes;
    std::memcpy(&lanes, values, sizeof(lanes));
    return lanes;
}

struct FourLanes {
    Lanes a, b, c, d;
};

/// Turns four rows of four columns into four columns of four rows.
FourLanes transposed(const FourLanes& m) {
    const Lanes lowAb = __builtin_shufflevector(m.a, m.b, 0, 4, 1, 5);
    const Lanes highAb = __builtin_shufflevector(m.a, m.b, 2, 6, 3, 7);
    const Lanes lowCd = __builtin_shufflevector(m.c, m.d, 0, 4, 1, 5);
    const Lanes highCd = __builtin_shufflevector(m.c, m.d, 2, 6, 3, 7);
    return {__builtin_shufflevector(lowAb, lowCd, 0, 1, 4, 5),
            __builtin_shufflevector(lowAb, lowCd, 2, 3, 6, 7),
            __builtin_shufflevector(highAb, highCd, 0, 1, 4, 5),
            __builtin_shufflevector(highAb, highCd, 2, 3, 6, 7)};
}

/// Rows of `stride` floats to columns of four, and back; whole groups of four columns.
void interleave(const float* rows, u64 stride, Lanes* columns) {
    for (u64 k = 0; k < stride; k += rowsAtOnce) {
        const FourLanes group{load(rows + k), load(rows + stride + k), load(rows + 2 * stride + k),
                              load(rows + 3 * stride + k)};
        const FourLanes turned = transposed(group);
        std::memcpy(columns + k, &turned, sizeof(turned));
    }
}

void separate(const Lanes* columns, u64 stride, float* rows) {
    for (u64 k = 0; k < stride; k += rowsAtOnce) {
        const FourLanes turned =
            transposed({columns[k], columns[k + 1], columns[k + 2], columns[k + 3]});
        std::memcpy(rows + k, &turned.a, sizeof(Lanes));
        std::memcpy(rows + stride + k, &turned.b, sizeof(Lanes));
        std::memcpy(rows + 2 * stride + k, &turned.c, sizeof(Lanes));
        std::memcpy(rows + 3 * stride + k, &turned.d, sizeof(Lanes));
    }
}

u64 roundedUp(u64 count) {
    return (count + rowsAtOnce - 1) / rowsAtOnce * rowsAtOnce;
}

/// The position inside a source of `size` that stands for `position`.
u32 resolved(i64 position, u32 size, bool wraps) {
    if (wraps)
        return static_cast<u32>((position % size + size) % size);
    return static_cast<u32>(std::clamp<i64>(position, 0, i64(size) - 1));
}

/// What is stored for a weighted sum of numbers.
template <class T>
T fromSum(float sum) {
    if constexpr (!isIntegerComponent<T>) {
        return static_cast<T>(sum);
    } else {
        constexpr auto max = static_cast<float>(std::numeric_limits<T>::max());
        if constexpr (std::is_same_v<T, u8>) {
            // Multiples of 256, as all floats from 2^31 on are, have no low bits to keep.
            const float scaled = sum * max;
            const float positive = scaled > 0 ? scaled : 0;
            const float small = positive < 0x1p31f ? positive : 0;
            return static_cast<u8>(static_cast<i32>(small));
        } else if constexpr (std::is_same_v<T, u16>) {
            const float scaled = std::min(sum > 0 ? sum * max : 0, 0x1p62f);
            return static_cast<u16>(static_cast<i64>(scaled));
        } else {
            return base::saturate<T>(sum * max);
        }
    }
}

/// Takes rows of components to the numbers that are summed, and sums to components.
template <class T>
class RowNumbers {
public:
    explicit RowNumbers(const Image& image)
        : transform_(image.colorTransform()), channelCount_(image.channelCount()),
          alphaIndex_(image.alphaIndex()) {}

    void toNumbers(const T* row, float* numbers, u32 width) const {
        const u64 count = u64(width) * channelCount_;
        for (u64 k = 0; k < count; ++k)
            numbers[k] = toNumber(row[k]);
        if (transform_) {
            applyTable(row, numbers, count);
            if (transform_->converter)
                transform_->converter->toWorking(numbers, width, channelCount_);
        }
    }

    /// Adds the numbers of `row`, times `weight`. `numbers` is room for a row.
    void addNumbers(const T* row, float weight, float* sums, float* numbers, u32 width) const {
        const u64 count = u64(width) * channelCount_;
        if (!transform_) {
            for (u64 k = 0; k < count; ++k)
                sums[k] += weight * toNumber(row[k]);
            return;
        }
        toNumbers(row, numbers, width);
        for (u64 k = 0; k < count; ++k)
            sums[k] += weight * numbers[k];
    }

    /// Changes `sums`.
    void fromSums(float* sums, T* row, u32 width) const {
        const u64 count = u64(width) * channelCount_;
        if (transform_) {
            if (transform_->converter)
                transform_->converter->fromWorking(sums, width, channelCount_);
            std::transform(sums, sums + count, sums,
                           [](float sum) { return std::clamp(sum, 0.0f, 1.0f); });
        }
        for (u64 k = 0; k < count; ++k)
            row[k] = fromSum<T>(sums[k]);
    }

private:
    void applyTable(const T* row, float* numbers, u64 count) const {
        if constexpr (std::is_unsigned_v<T>) {
            const vector<float>& table = transform_->table;
            for (u64 pixel = 0; pixel < count; pixel += channelCount_) {
                for (u32 c = 0; c < channelCount_; ++c) {
                    const T component = row[pixel + c];
                    if (static_cast<i32>(c) != alphaIndex_ && component < table.size())
                        numbers[pixel + c] = table.data()[component];
                }
            }
        }
    }

    const ColorTransform* transform_;
    u32 channelCount_;
    i32 alphaIndex_;
};

/// Sums up the taps of every target column, for `Channels` components a pixel.
template <u32 Channels>
void sumColumns(const ResizeKernel& kernel, const Lanes* columns, Lanes* sums) {
    for (u32 x = 0; x < kernel.targetSize(); ++x, sums += Channels) {
        const ResizeKernel::Taps& taps = kernel.taps(x);
        const float* weights = kernel.weights(taps);
        const Lanes* source = columns + static_cast<u64>(taps.first - kernel.first()) * Channels;
        Lanes sum[Channels] = {};
        for (u32 t = 0; t < taps.count; ++t, source += Channels) {
            for (u32 c = 0; c < Channels; ++c)
                sum[c] += weights[t] * source[c];
        }
        std::memcpy(sums, sum, sizeof(sum));
    }
}

/// The rows of one slice resampled in width, made when they are first asked for.
template <class T>
class ResampledRows {
public:
    ResampledRows(const Image& source, u64 firstRow, u32 rowCount, const ResizeKernel& columns,
                  const ResizeKernel& rows, bool wraps)
        : source_(source), codec_(source), columns_(columns), firstRow_(firstRow),
          rowCount_(rowCount), lastPosition_(rows.last()), wraps_(wraps),
          channelCount_(source.channelCount()), targetWidth_(columns.targetSize()) {
        // Places before and behind the source, which the taps may reach, are filled as the edge
        // rule says.
        const auto reach = static_cast<u64>(columns.last() - columns.first() + 1);
        sourceStride_ = roundedUp(reach * channelCount_);
        targetStride_ = roundedUp(u64(targetWidth_) * channelCount_);
        numbers_.resize(sourceStride_ * rowsAtOnce);
        interleaved_.resize(sourceStride_);
        sums_.resize(targetStride_);
        separated_.resize(targetStride_ * rowsAtOnce);
        kept_.resize(rows.greatestCount() + rowsAtOnce);
        for (Kept& kept : kept_)
            kept.components.resizeUninitialized(u64(targetWidth_) * channelCount_);
    }

    /// The row that stands at `position`.
    const T* at(i64 position) {
        if (place(position).position != position)
            resample(position);
        return place(position).components.data();
    }

private:
    struct Kept {
        i64 position = noPosition;
        vector<T> components;
    };
    static constexpr i64 noPosition = std::numeric_limits<i64>::min();

    Kept& place(i64 position) {
        const auto count = static_cast<i64>(kept_.size());
        return kept_[static_cast<std::size_t>((position % count + count) % count)];
    }

    void resample(i64 position) {
        for (u32 lane = 0; lane < rowsAtOnce; ++lane)
            readRow(std::min(position + lane, lastPosition_), lane);
        interleave(numbers_.data(), sourceStride_, interleaved_.data());
        switch (channelCount_) {
        case 1:
            sumColumns<1>(columns_, interleaved_.data(), sums_.data());
            break;
        case 2:
            sumColumns<2>(columns_, interleaved_.data(), sums_.data());
            break;
        case 3:
            sumColumns<3>(columns_, interleaved_.data(), sums_.data());
            break;
        default:
            sumColumns<4>(columns_, interleaved_.data(), sums_.data());
        }
        separate(sums_.data(), targetStride_, separated_.data());
        for (u32 lane = 0; lane < rowsAtOnce && position + lane <= lastPosition_; ++lane) {
            Kept& kept = place(position + lane);
            codec_.fromSums(separated_.data() + targetStride_ * lane, kept.components.data(),
                            targetWidth_);
            kept.position = position + lane;
        }
    }

    /// Fills row `lane` of `numbers_` with all that the taps reach.
    void readRow(i64 position, u32 lane) {
        const u32 y = resolved(position, rowCount_, wraps_);
        const T* components = reinterpret_cast<const T*>(source_.row(firstRow_ + y));
        float* target = numbers_.data() + sourceStride_ * lane;
        const i64 first = columns_.first(), last = columns_.last();
        const u32 width = source_.width();
        // The source's own places are a range within those that the taps reach, or the other way
        // round.
        const i64 firstInside = std::max<i64>(first, 0);
        const i64 lastInside = std::min<i64>(last, i64(width) - 1);
        if (firstInside <= lastInside)
            codec_.toNumbers(components + firstInside * channelCount_,
                             target + (firstInside - first) * channelCount_,
                             static_cast<u32>(lastInside - firstInside + 1));
        const auto fill = [&](i64 x) {
            const T* pixel = components + u64(resolved(x, width, wraps_)) * channelCount_;
            codec_.toNumbers(pixel, target + (x - first) * channelCount_, 1);
        };
        for (i64 x = first; x < std::min<i64>(last + 1, 0); ++x)
            fill(x);
        for (i64 x = std::max<i64>(first, width); x <= last; ++x)
            fill(x);
    }

    const Image& source_;
    RowNumbers<T> codec_;
    const ResizeKernel& columns_;
    u64 firstRow_;
    u32 rowCount_;
    i64 lastPosition_;
    bool wraps_;
    u32 channelCount_;
    u32 targetWidth_;
    u64 sourceStride_, targetStride_;
    vector<float> numbers_; ///< of `rowsAtOnce` rows of what the taps reach
    vector<Lanes> interleaved_;
    vector<Lanes> sums_;
    vector<float> separated_;
    vector<Kept> kept_;
};

/// Resamples one slice.
template <class T>
void resizeRows(const Image& source, u64 sourceRow, u32 sourceHeight, Image& target, u64 targetRow,
                const ResizeKernel& columns, const ResizeKernel& rows, bool wraps) {
    ResampledRows<T> resampled(source, sourceRow, sourceHeight, columns, rows, wraps);
    const RowNumbers<T> codec(source);
    const u64 count = u64(columns.targetSize()) * source.channelCount();
    vector<float> sums(count), numbers(count);
    for (u32 y = 0; y < rows.targetSize(); ++y) {
        const ResizeKernel::Taps& taps = rows.taps(y);
        const float* weights = rows.weights(taps);
        std::fill(sums.begin(), sums.end(), 0.0f);
        for (u32 t = 0; t < taps.count; ++t)
            codec.addNumbers(resampled.at(taps.first + t), weights[t], sums.data(), numbers.data(),
                             columns.targetSize());
        codec.fromSums(sums.data(), reinterpret_cast<T*>(target.row(targetRow + y)),
                       columns.targetSize());
    }
}

} // namespace

ref<Image> Image::resize(const base::Filter& filter, u32 width, u32 height, u32 depth, bool wrap,
                         bool extend) {
    if (isCompressed() || !hasPixels() || width_ == 0)
        return {};
    if (width == width_ && height == height_)
        return ref<Image>(this);
    if (depth != depth_) {
        base::log().log(base::logIO, base::logError,
                        "Image::resize(): the depth can't change from {} to {}.", depth_, depth);
        return {};
    }
    if (width == 0 || height == 0)
        return {};
    ref<Image> target = makeLike(*this, width, height, byteAlignment_, format_, type_);
    if (!target)
        return {};

    // The faces of a cube map are one picture here.
    const u32 faces = isCube() ? 6 : 1;
    const u32 sourceRows = height_ * faces, targetRows = height * faces;
    const bool cutsAtEdges = !wrap && !extend;
    const ResizeKernel columns(filter, width_, width, cutsAtEdges);
    std::optional<ResizeKernel> others;
    if (sourceRows != width_ || targetRows != width)
        others.emplace(filter, sourceRows, targetRows, cutsAtEdges);
    const ResizeKernel& rows = others ? *others : columns;

    const bool isKnown = dispatchType(type_, [&](auto component) {
        using T = decltype(component);
        for (u32 z = 0; z < depth_; ++z)
            resizeRows<T>(*this, u64(sourceRows) * z, sourceRows, *target, u64(targetRows) * z,
                          columns, rows, wrap);
    });
    return isKnown ? target : ref<Image>();
}

} // namespace iio
