#include "gltf/vertex_array.h"

#include "b_exception.h"
#include "b_log.h"
#include "scene_schema.h"

#include <algorithm>
#include <bit>
#include <limits>

namespace gltf {

using base::i32;
using base::IPlugin;
using base::ref;
using base::string_view;
using base::u32;

bool mayBorrow(const base::AttribMap& map, base::name_id name) {
    const base::Attribute* own = map.findAttribute(name, false, false);
    const base::AttribLink* link = own ? own->asLink() : nullptr;
    if (!link)
        return own != nullptr;
    const IPlugin* owner = link->path().root();
    return owner && owner->typeName() == scene::bufferAdapter_schema::n_kind;
}

void VertexArray::replace(base::vector<float> values, std::size_t components) {
    own_ = std::move(values);
    values_ = std::as_const(own_).data();
    components_ = components;
    count_ = own_.size() / components;
}

bool isFinite(const float* values, std::size_t count) {
    // The exponent of what is not finite has all bits set. Without an early end, so that the
    // compiler compares whole vector registers.
    constexpr u32 exponent = 0x7f800000u;
    u32 found = 0;
    for (std::size_t i = 0; i < count; ++i)
        found |= (std::bit_cast<u32>(values[i]) & exponent) == exponent;
    return found == 0;
}

bool makeFinite(VertexArray& array, const IPlugin& object, string_view what) {
    if (isFinite(array.values(), array.valueCount()))
        return false;
    base::vector<float> repaired(array.values(), array.values() + array.valueCount());
    std::size_t count = 0;
    for (float& value : repaired) {
        if (isFinite(&value, 1))
            continue;
        value = 0;
        ++count;
    }
    array.replace(std::move(repaired), array.components());
    base::log().log(base::logScene, base::logWarning,
                    "gltf |{}| Found values that are not finite in '{}', {} of them are set to 0!",
                    object.getName(), what, count);
    return true;
}

bool fitsVertices(const VertexArray& array, std::size_t vertexCount, const IPlugin& object,
                  string_view what) {
    if (!array || array.count() == vertexCount)
        return static_cast<bool>(array);
    base::log().log(base::logScene, base::logError,
                    "gltf |{}| Wrong number of elements in '{}', the data is left out! Expected {} "
                    "elements, found {}.",
                    object.getName(), what, vertexCount, array.count());
    return false;
}

i32 checkedLength(base::u64 byteCount, const IPlugin& object) {
    if (byteCount > static_cast<base::u64>(std::numeric_limits<i32>::max()))
        throw base::exception(
            base::format("The geometry '{}' has data of {} bytes, which exceeds the 2147483647 "
                         "bytes of a buffer",
                         object.getName(), byteCount),
            "vertex_array", "gltf::checkedLength", __LINE__);
    return static_cast<i32>(byteCount);
}

ref<GLTF::BufferView> makeVertexView(const VertexArray& array, const IPlugin& object) {
    return base::makeRef<GLTF::BufferView>(
        array.values(), checkedLength(array.valueCount() * sizeof(float), object),
        GLTF::BufferView::arrayBuffer, array.mustCopy());
}

ref<GLTF::BufferView> makeVertexView(ref<GLTF::Buffer> buffer) {
    const i32 byteLength = buffer->byteLength;
    return base::makeRef<GLTF::BufferView>(0, byteLength, std::move(buffer),
                                           GLTF::BufferView::arrayBuffer);
}

ref<GLTF::Accessor> makeAccessor(GLTF::Accessor::Type type, std::size_t count,
                                 ref<GLTF::BufferView> view, i32 componentType) {
    return base::makeRef<GLTF::Accessor>(type, componentType, 0, static_cast<i32>(count),
                                         std::move(view));
}

void setBounds(GLTF::Accessor& positions, const base::box3f& box) {
    positions.allocateMinMax();
    std::copy_n(&box.min.x, 3, positions.min.get());
    std::copy_n(&box.max.x, 3, positions.max.get());
}

} // namespace gltf
