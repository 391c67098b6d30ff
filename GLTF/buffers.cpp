#include "GLTF/document.h"

#include "GLTF/element_range.h"
#include "GLTF/json_writer.h"

#include "b_exception.h"
#include "b_format.h"
#include "b_pages.h"

#include <iterator>

namespace GLTF {

namespace {

/// Calls `function` with a value of the component's C++ type; false for an unknown number.
template <class Function>
bool withComponentType(i32 componentType, Function&& function) {
    switch (componentType) {
    case componentI8:
        function(base::i8());
        return true;
    case componentU8:
        function(u8());
        return true;
    case componentI16:
        function(base::i16());
        return true;
    case componentU16:
        function(base::u16());
        return true;
    case componentU32:
        function(u32());
        return true;
    case componentFloat:
        function(float());
        return true;
    default:
        return false;
    }
}

template <class T>
T load(const u8* at) {
    T value;
    std::memcpy(&value, at, sizeof(T));
    return value;
}

/// A comparison with NaN is false, so NaN never replaces a bound and a bound that is NaN stays.
template <class T>
void widen(T& low, T& high, T value) {
    low = value < low ? value : low;
    high = high < value ? value : high;
}

/// Bounds of `count` tight elements of N components. Works on several elements side by side, so
/// that the compiler turns a step into whole vector registers.
template <class T, int N>
void tightBounds(const u8* at, i64 count, float* low, float* high) {
    constexpr int lanes = N * (N == 1 ? 16 : N == 2 ? 8 : 4);
    T lows[lanes], highs[lanes];
    for (int lane = 0; lane < lanes; ++lane)
        lows[lane] = highs[lane] = load<T>(at + static_cast<std::size_t>(lane % N) * sizeof(T));

    const i64 total = count * N;
    i64 i = 0;
    for (; i + lanes <= total; i += lanes, at += lanes * sizeof(T)) {
        for (int lane = 0; lane < lanes; ++lane)
            widen(lows[lane], highs[lane],
                  load<T>(at + static_cast<std::size_t>(lane) * sizeof(T)));
    }
    for (int lane = 0; i < total; ++i, ++lane, at += sizeof(T))
        widen(lows[lane], highs[lane], load<T>(at));

    for (int lane = N; lane < lanes; ++lane) {
        widen(lows[lane % N], highs[lane % N], lows[lane]);
        widen(lows[lane % N], highs[lane % N], highs[lane]);
    }
    for (int c = 0; c < N; ++c) {
        low[c] = static_cast<float>(lows[c]);
        high[c] = static_cast<float>(highs[c]);
    }
}

template <class T>
void stridedBounds(const ElementRange& range, i64 count, int components, float* low, float* high) {
    for (int c = 0; c < components; ++c) {
        const std::size_t offset = static_cast<std::size_t>(c) * sizeof(T);
        T least = load<T>(range.element(0) + offset), greatest = least;
        for (i64 i = 1; i < count; ++i)
            widen(least, greatest, load<T>(range.element(i) + offset));
        low[c] = static_cast<float>(least);
        high[c] = static_cast<float>(greatest);
    }
}

/// Bounds of the first `count` elements, at least one, which all lie in the buffer.
template <class T>
void elementBounds(const ElementRange& range, i64 count, int components, float* low, float* high) {
    if (!range.isTight() || components > 4)
        stridedBounds<T>(range, count, components, low, high);
    else if (components == 1)
        tightBounds<T, 1>(range.element(0), count, low, high);
    else if (components == 2)
        tightBounds<T, 2>(range.element(0), count, low, high);
    else if (components == 3)
        tightBounds<T, 3>(range.element(0), count, low, high);
    else
        tightBounds<T, 4>(range.element(0), count, low, high);
}

i32 elementsByteLength(Accessor::Type type, i32 componentType, i64 count) {
    const i64 byteLength = i64(Accessor::numberOfComponents(type)) *
                           Accessor::componentByteLength(componentType) * std::max(count, i64(0));
    if (byteLength > std::numeric_limits<i32>::max())
        throw base::exception(
            base::format("Accessor data of {} bytes exceeds the 2147483647 bytes of a buffer",
                         byteLength),
            "buffers", "GLTF::Accessor::Accessor", __LINE__);
    return static_cast<i32>(byteLength);
}

void writeBounds(JsonWriter& writer, const float* bounds, i32 components, i32 componentType) {
    writer.startArray();
    for (i32 c = 0; c < components; ++c) {
        if (componentType == componentFloat)
            writer.floatValue(bounds[c]);
        else
            writer.intValue(base::saturate<i32>(bounds[c]));
    }
    writer.endArray();
}

} // namespace

Buffer::Buffer(i32 length)
    : data(static_cast<u8*>(
          base::AllocPolicy::allocate(static_cast<std::size_t>(std::max(length, 0))))),
      ownsData(true), byteLength(std::max(length, 0)) {}

Buffer::Buffer(const void* source, i32 length, bool copy)
    : data(static_cast<u8*>(const_cast<void*>(source))),
      byteLength(source ? std::max(length, 0) : 0) {
    if (!copy)
        return;
    const auto byteCount = static_cast<std::size_t>(byteLength);
    data = static_cast<u8*>(base::AllocPolicy::allocate(byteCount));
    ownsData = true;
    if (byteCount != 0)
        std::memcpy(data, source, byteCount);
}

Buffer::~Buffer() {
    if (ownsData)
        base::AllocPolicy::free(data);
}

ref<Buffer> Buffer::zeroed(i32 length) {
    auto buffer = base::makeRef<Buffer>(0);
    buffer->data = static_cast<u8*>(
        base::AllocPolicy::allocateZeroed(static_cast<std::size_t>(std::max(length, 0))));
    buffer->byteLength = std::max(length, 0);
    base::prefault(buffer->data, static_cast<std::size_t>(buffer->byteLength));
    return buffer;
}

string Buffer::typeName() const {
    return "buffer";
}

void Buffer::writeJSON(JsonWriter& writer, const Options& options) {
    writer.intMember("byteLength", byteLength);
    if (!options.embedBuffers) {
        uri = options.name + std::to_string(id) + ".bin";
        writer.textMember("uri", uri);
    } else if (!options.binary) {
        writer.key("uri");
        const string_view text = writer.dataUriValue("application/octet-stream", data,
                                                     static_cast<std::size_t>(byteLength));
        uri.clear();
        uri.reserve(text.size());
        base::prefault(uri.data(), text.size());
        uri = text;
    }
    Object::writeJSON(writer, options);
}

BufferView::BufferView(i32 offset, i32 length, ref<Buffer> onBuffer, i32 viewTarget)
    : buffer(std::move(onBuffer)), byteOffset(offset), byteLength(length), target(viewTarget) {}

BufferView::BufferView(const void* data, i32 length, i32 viewTarget, bool copy)
    : buffer(base::makeRef<Buffer>(data, length, copy)), byteLength(buffer->byteLength),
      target(viewTarget) {}

BufferView::~BufferView() = default;

string BufferView::typeName() const {
    return "bufferView";
}

void BufferView::writeJSON(JsonWriter& writer, const Options& options) {
    if (buffer)
        writer.intMember("buffer", buffer->id);
    writer.intMember("byteOffset", byteOffset);
    writer.intMember("byteLength", byteLength);
    if (byteStride != 0)
        writer.intMember("byteStride", byteStride);
    if (target >= 1)
        writer.intMember("target", target);
    Object::writeJSON(writer, options);
}

Accessor::Accessor(Type elementType, i32 type_) : componentType(type_), type(elementType) {}

Accessor::Accessor(Type elementType, i32 type_, const void* data, i32 elementCount, i32 target)
    : componentType(type_), count(data ? std::max(elementCount, 0) : 0), type(elementType) {
    bufferView = base::makeRef<BufferView>(
        data, elementsByteLength(elementType, componentType, count), target, true);
    computeMinMax();
}

Accessor::Accessor(Type elementType, i32 type_, i32 offset, i32 elementCount, ref<BufferView> view)
    : bufferView(std::move(view)), byteOffset(offset), componentType(type_), count(elementCount),
      type(elementType) {}

Accessor::~Accessor() = default;

string Accessor::typeName() const {
    return "accessor";
}

i32 Accessor::numberOfComponents(Type type) {
    static constexpr i32 numbers[] = {1, 2, 3, 4, 4, 9, 16};
    const auto index = static_cast<u32>(type);
    return index < std::size(numbers) ? numbers[index] : 0;
}

i32 Accessor::componentByteLength(i32 componentType) {
    i32 length = 0;
    withComponentType(componentType, [&](auto value) { length = sizeof(value); });
    return length;
}

const char* Accessor::typeText(Type type) {
    static constexpr const char* texts[] = {"SCALAR", "VEC2", "VEC3", "VEC4",
                                            "MAT2",   "MAT3", "MAT4"};
    const auto index = static_cast<u32>(type);
    return index < std::size(texts) ? texts[index] : "";
}

i32 Accessor::getByteStride() const {
    if (bufferView && bufferView->byteStride != 0)
        return bufferView->byteStride;
    return getNumberOfComponents() * getComponentByteLength();
}

bool Accessor::getComponentsAtIndex(i32 index, float* out) const {
    const i32 components = getNumberOfComponents();
    if (components == 0)
        return true;
    const ElementRange range(*this);
    const i64 readable = range.readableBytes(index);
    return withComponentType(componentType, [&]<class T>(T) {
        for (i32 c = 0; c < components; ++c) {
            const i64 offset = c * i64(sizeof(T));
            out[c] =
                offset < readable ? static_cast<float>(load<T>(range.element(index) + offset)) : 0;
        }
    });
}

bool Accessor::writeComponentsAtIndex(i32 index, const float* in) {
    const i32 components = getNumberOfComponents();
    if (components == 0)
        return true;
    const ElementRange range(*this);
    const i64 writable = range.readableBytes(index);
    return withComponentType(componentType, [&]<class T>(T value) {
        for (i64 offset = 0; offset < writable; offset += i64(sizeof(T)), ++in) {
            if constexpr (std::is_integral_v<T>)
                value = base::saturate<T>(*in);
            else
                value = *in;
            std::memcpy(range.element(index) + offset, &value, sizeof(T));
        }
    });
}

void Accessor::allocateMinMax() {
    const auto components = static_cast<std::size_t>(getNumberOfComponents());
    if (!max)
        max = std::make_unique<float[]>(components);
    if (!min)
        min = std::make_unique<float[]>(components);
}

bool Accessor::computeMinMax() {
    if (count < 1)
        return true;
    if (getComponentByteLength() == 0)
        return false;
    allocateMinMax();

    const i32 components = getNumberOfComponents();
    const ElementRange range(*this);
    const i64 whole = range.wholeElements(count);
    if (whole > 0) {
        withComponentType(componentType, [&]<class T>(T) {
            elementBounds<T>(range, whole, components, min.get(), max.get());
        });
    } else {
        getComponentsAtIndex(0, min.get());
        std::copy_n(min.get(), components, max.get());
    }

    // Elements that reach past the buffer, and one for all that lie behind it.
    const i64 end = std::min(range.partialEnd(count) + 1, i64(count));
    float values[16];
    for (i64 i = whole; i < end; ++i) {
        getComponentsAtIndex(static_cast<i32>(i), values);
        for (i32 c = 0; c < components; ++c)
            widen(min[static_cast<std::size_t>(c)], max[static_cast<std::size_t>(c)], values[c]);
    }
    return true;
}

void Accessor::writeJSON(JsonWriter& writer, const Options& options) {
    if (bufferView) {
        writer.intMember("bufferView", bufferView->id);
        writer.intMember("byteOffset", byteOffset);
    }
    writer.intMember("componentType", componentType);
    writer.intMember("count", count);
    if (max) {
        writer.key("max");
        writeBounds(writer, max.get(), getNumberOfComponents(), componentType);
    }
    if (min) {
        writer.key("min");
        writeBounds(writer, min.get(), getNumberOfComponents(), componentType);
    }
    writer.textMember("type", typeText(type));
    Object::writeJSON(writer, options);
}

} // namespace GLTF
