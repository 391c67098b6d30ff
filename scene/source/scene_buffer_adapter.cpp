#include "scene.h"

#include "b_log.h"

#include <algorithm>

namespace scene {

namespace {

/// The bytes that an adapter's outputs view.
struct ByteRange {
    const base::u8* begin;
    std::size_t length;
};

/// Turns the output, if the adapter has it, into a view of `bytes`; whole elements alone.
template <class T>
void view(base::AttribMap& adapter, const SchemaAttribute<Array<T>>& output, ByteRange bytes) {
    if (!find(adapter, output))
        return;
    base::Attribute* attribute = adapter.findAttribute(output);
    const auto* first = reinterpret_cast<const T*>(bytes.begin);
    static_cast<Array<T>*>(attribute->data())->setView(first, first + bytes.length / sizeof(T));
    // Tells the readers of the output.
    adapter.findAttributeMutable(output);
}

} // namespace

bool IBufferAdapter::isPathKeyed(const base::AttribPath& path) const {
    if (path.steps().size() < 2)
        return false;
    const base::name_id name = path.steps()[1].name;
    return name == n_inputBuffer || name == n_inputOffset || name == n_inputLength;
}

void IBufferAdapter::afterLoad(base::i32) {
    refresh();
}

void IBufferAdapter::changed(base::u32, const base::AttribPath& path) {
    if (path.empty() || path.steps()[0].index != id())
        refresh();
}

void IBufferAdapter::refresh() {
    base::IPlugin* buffer = findObject(*this, n_inputBuffer);
    if (!buffer) {
        base::log().log(base::logScene, base::logWarning,
                        "bufferAdapter |{}| Missing `inputBuffer` attribute!", getName());
        return;
    }
    const auto* data = find(*buffer, buffer_schema::n_data);
    if (!data) {
        base::log().log(base::logScene, base::logWarning,
                        "bufferAdapter |{}| Missing `data` attribute in {}!", getName(),
                        buffer->getName());
        return;
    }
    const std::size_t size = data->size();
    const std::size_t offset = std::min<std::size_t>(read(*this, n_inputOffset), size);
    const std::size_t length = std::min<std::size_t>(read(*this, n_inputLength), size - offset);
    // The length counts from the start of the data, whatever the offset.
    const ByteRange bytes{data->data() + offset, length > offset ? length - offset : 0};

    view(*this, n_outputUint8, bytes);
    view(*this, n_outputUint16, bytes);
    view(*this, n_outputUint32, bytes);
    view(*this, n_outputFloat, bytes);
    view(*this, n_outputFloat2, bytes);
    view(*this, n_outputFloat3, bytes);
    view(*this, n_outputFloat4, bytes);
    viewedBuffer_ = base::ref<base::IPlugin>(buffer);
}

} // namespace scene
