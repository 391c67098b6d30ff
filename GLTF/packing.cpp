#include "GLTF/collect.h"
#include "GLTF/element_range.h"
#include "GLTF/prefetch.h"

#include "b_exception.h"
#include "b_format.h"

#include <algorithm>
#include <bit>

namespace GLTF {

namespace {

/// An accessor and its place in the group's view.
struct Placed {
    Accessor* accessor;
    i64 byteLength;
    i32 componentLength;
    i32 byteOffset;
    bool isSuperseded; ///< listed again later: that place counts, this one stays empty
};

/// Accessors that share a target and a stride, and the one view that replaces theirs.
struct Group {
    i32 target = BufferView::noTarget;
    i32 stride = 0;
    vector<Placed> accessors;
    i32 byteLength = 0;
    ref<BufferView> view;
};

/// What is to be packed.
struct Plan {
    vector<Group> groups; ///< ordered by target and then by stride
    vector<BufferView*> streams;
    i64 oldLength = 0; ///< of all old views, each counted once for every accessor on it
    bool hasRepeats = false;
};

/// u32 elements beyond this are not all represented by a float.
constexpr u32 exactInFloat = 1u << 24;

i32 checkedLength(i64 byteLength) {
    if (byteLength > std::numeric_limits<i32>::max())
        throw base::exception(
            base::format("Packed data of {} bytes exceeds the 2147483647 bytes of a buffer",
                         byteLength),
            "packing", "GLTF::Asset::packAccessors", __LINE__);
    return static_cast<i32>(byteLength);
}

Group& findGroup(vector<Group>& groups, i32 target, i32 stride) {
    for (Group& group : groups) {
        if (group.target == target && group.stride == stride)
            return group;
    }
    Group& group = groups.emplace_back();
    group.target = target;
    group.stride = stride;
    return group;
}

void addAccessor(Plan& plan, Accessor& accessor) {
    const i32 componentLength = accessor.getComponentByteLength();
    const i64 byteLength =
        i64(accessor.getNumberOfComponents()) * componentLength * std::max(accessor.count, 0);
    Group& group = findGroup(plan.groups, accessor.bufferView->target, accessor.getByteStride());
    group.accessors.push_back({&accessor, byteLength, componentLength, 0, false});
    plan.oldLength += accessor.bufferView->byteLength;
}

Plan makePlan(const vector<Accessor*>& accessors, vector<BufferView*> streams) {
    Plan plan;
    plan.streams = std::move(streams);
    const Walk walk;
    for (std::size_t i = 0; i < accessors.size(); ++i) {
        if (i + 2 * prefetchDistance < accessors.size())
            prefetch(accessors[i + 2 * prefetchDistance]);
        if (i + prefetchDistance < accessors.size())
            prefetch(accessors[i + prefetchDistance]->bufferView.get());
        if (!accessors[i]->bufferView)
            continue;
        plan.hasRepeats |= !walk.take(*accessors[i]);
        addAccessor(plan, *accessors[i]);
    }
    std::sort(plan.groups.begin(), plan.groups.end(), [](const Group& a, const Group& b) {
        return std::pair(a.target, a.stride) < std::pair(b.target, b.stride);
    });
    return plan;
}

/// Places the accessors of a group one behind the other, each at a multiple of its component.
void layOut(Group& group) {
    i64 byteOffset = 0;
    for (Placed& placed : group.accessors) {
        if (const i64 unit = placed.componentLength; unit > 1)
            byteOffset = (byteOffset + unit - 1) / unit * unit;
        placed.byteOffset = checkedLength(byteOffset);
        byteOffset += placed.byteLength;
    }
    group.byteLength = checkedLength(byteOffset);
}

void markSuperseded(Group& group) {
    const Walk walk;
    for (std::size_t i = group.accessors.size(); i-- > 0;) {
        Placed& placed = group.accessors[i];
        placed.isSuperseded = !walk.take(*placed.accessor);
    }
}

/// The nearest float of each value as an integer again, clamped to the type. Conditions are masks
/// and no branches, so that the compiler works on whole vector registers.
void copyThroughFloat(const u8* from, std::size_t count, u8* to) {
    constexpr u32 roundsTo32Bits = 0x7fffffc0, roundsTo33Bits = 0xffffff80;
    constexpr u32 signBit = 0x80000000;
    const u32 signBitAsFloat = std::bit_cast<u32>(2147483648.0f);
    for (std::size_t i = 0; i < count; ++i) {
        u32 value;
        std::memcpy(&value, from + i * 4, 4);
        const u32 overMask = 0u - static_cast<u32>(value >= roundsTo33Bits);
        value &= ~overMask;
        // Both products are exact; the one rounding happens in the sum.
        const float real = static_cast<float>(static_cast<i32>(value >> 16)) * 65536.0f +
                           static_cast<float>(static_cast<i32>(value & 0xffff));
        // The conversion back is one of signed integers.
        const u32 highMask = 0u - static_cast<u32>(value >= roundsTo32Bits);
        const float low = real - std::bit_cast<float>(highMask & signBitAsFloat);
        const u32 result =
            (static_cast<u32>(static_cast<i32>(low)) + (highMask & signBit)) | overMask;
        std::memcpy(to + i * 4, &result, 4);
    }
}

/// Copies u32 values as a pass through float leaves them. Block by block: the search for large
/// values brings a block into the cache for the copy.
void copyU32(const u8* from, std::size_t count, u8* to) {
    constexpr std::size_t blockLength = 4096;
    for (std::size_t start = 0; start < count; start += blockLength) {
        const std::size_t n = std::min(blockLength, count - start);
        const u8* const source = from + start * 4;
        u32 largest = 0;
        for (std::size_t i = 0; i < n; ++i) {
            u32 value;
            std::memcpy(&value, source + i * 4, 4);
            largest = std::max(largest, value);
        }
        if (largest <= exactInFloat)
            std::memcpy(to + start * 4, source, n * 4);
        else
            copyThroughFloat(source, n, to + start * 4);
    }
}

/// Every component type but u32 survives the pass through float unchanged.
void copyRun(const u8* from, i64 byteCount, u8* to, i32 componentType) {
    if (componentType == componentU32)
        copyU32(from, static_cast<std::size_t>(byteCount) / 4, to);
    else
        std::memcpy(to, from, static_cast<std::size_t>(byteCount));
}

template <std::size_t N>
void copyStrided(const u8* from, i64 stride, i64 count, u8* to) {
    for (i64 i = 0; i < count; ++i, from += stride, to += N)
        std::memcpy(to, from, N);
}

/// Copies the elements tightly to `to`, which is zero where the source can't be read.
void copyElements(const Accessor& accessor, u8* to) {
    const ElementRange range(accessor);
    const i64 length = range.elementLength(), count = std::max(accessor.count, 0);
    const i64 whole = range.wholeElements(count);
    const bool isU32 = accessor.componentType == componentU32;
    if (range.isTight() && whole > 0)
        copyRun(range.element(0), whole * length, to, accessor.componentType);
    else if (length == 12 && !isU32)
        copyStrided<12>(range.element(0), range.stride(), whole, to);
    else if (length == 16 && !isU32)
        copyStrided<16>(range.element(0), range.stride(), whole, to);
    else if (length == 8 && !isU32)
        copyStrided<8>(range.element(0), range.stride(), whole, to);
    else {
        for (i64 i = 0; i < whole; ++i)
            copyRun(range.element(i), length, to + i * length, accessor.componentType);
    }
    for (i64 i = whole, end = range.partialEnd(count); i < end; ++i)
        copyRun(range.element(i), range.readableBytes(i), to + i * length, accessor.componentType);
}

/// Moves the group's data into its view. What nobody else holds of the old data is freed on the
/// way.
void moveData(const Group& group) {
    u8* const start = group.view->buffer->data + group.view->byteOffset;
    const vector<Placed>& list = group.accessors;
    for (std::size_t i = 0; i < list.size(); ++i) {
        if (i + 3 * prefetchDistance < list.size())
            prefetch(list[i + 3 * prefetchDistance].accessor);
        if (i + 2 * prefetchDistance < list.size())
            prefetch(list[i + 2 * prefetchDistance].accessor->bufferView.get());
        if (i + prefetchDistance < list.size())
            prefetch(list[i + prefetchDistance].accessor->bufferView->buffer.get());
        const Placed& placed = list[i];
        if (placed.isSuperseded)
            continue;
        copyElements(*placed.accessor, start + placed.byteOffset);
        placed.accessor->bufferView = group.view;
        placed.accessor->byteOffset = placed.byteOffset;
    }
}

/// Moves the data of a view of its own buffer to an offset of another.
void moveView(BufferView& view, const ref<Buffer>& buffer, i32 byteOffset) {
    if (view.buffer && view.byteLength > 0)
        std::memcpy(buffer->data + byteOffset, view.buffer->data + view.byteOffset,
                    static_cast<std::size_t>(view.byteLength));
    view.byteOffset = byteOffset;
    view.buffer = buffer;
}

/// The length that the old views had together, or what the new ones need, whichever is greater.
i32 bufferLength(const Plan& plan) {
    i64 newLength = 0, streamLength = 0;
    for (const Group& group : plan.groups)
        newLength += group.byteLength;
    for (const BufferView* stream : plan.streams)
        streamLength += stream->byteLength;
    return checkedLength(std::max(plan.oldLength, newLength) + streamLength);
}

} // namespace

ref<Buffer> Asset::packAccessors() {
    Plan plan = makePlan(getAllAccessors(), getAllCompressedBufferViews());
    for (Group& group : plan.groups) {
        layOut(group);
        if (plan.hasRepeats)
            markSuperseded(group);
    }
    const ref<Buffer> buffer = Buffer::zeroed(bufferLength(plan));

    // Long strides first: without padding between views, that alone keeps most views aligned.
    std::stable_sort(plan.groups.begin(), plan.groups.end(),
                     [](const Group& a, const Group& b) { return a.stride > b.stride; });
    i32 byteOffset = 0;
    for (Group& group : plan.groups) {
        group.view = base::makeRef<BufferView>(byteOffset, group.byteLength, buffer, group.target);
        if (group.target == BufferView::arrayBuffer)
            group.view->byteStride = group.stride;
        moveData(group);
        byteOffset += group.byteLength;
    }
    for (BufferView* stream : plan.streams) {
        moveView(*stream, buffer, byteOffset);
        byteOffset += stream->byteLength;
    }
    return buffer;
}

} // namespace GLTF
