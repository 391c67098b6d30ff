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

/// Turns the output, if the adapter has it, into a view of `bytes`; whole elements alone. Without
/// bytes a former view becomes empty, since what it viewed may be gone.
template <class T>
void view(base::AttribMap& adapter, const SchemaAttribute<Array<T>>& output,
          const ByteRange* bytes) {
    if (!find(adapter, output))
        return;
    auto& elements = *static_cast<Array<T>*>(adapter.findAttribute(output)->data());
    if (bytes) {
        const auto* first = reinterpret_cast<const T*>(bytes->begin);
        elements.setView(first, first + bytes->length / sizeof(T));
    } else if (elements.isView()) {
        elements.clear();
    } else {
        return;
    }
    // Tells the readers of the output.
    adapter.findAttributeMutable(output);
}

void viewAll(base::AttribMap& adapter, const ByteRange* bytes) {
    using Schema = bufferAdapter_schema;
    view(adapter, Schema::n_outputUint8, bytes);
    view(adapter, Schema::n_outputUint16, bytes);
    view(adapter, Schema::n_outputUint32, bytes);
    view(adapter, Schema::n_outputFloat, bytes);
    view(adapter, Schema::n_outputFloat2, bytes);
    view(adapter, Schema::n_outputFloat3, bytes);
    view(adapter, Schema::n_outputFloat4, bytes);
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
    const auto* data = buffer ? find(*buffer, buffer_schema::n_data) : nullptr;
    if (!buffer)
        base::log().log(base::logScene, base::logWarning,
                        "bufferAdapter |{}| Missing `inputBuffer` attribute!", getName());
    else if (!data)
        base::log().log(base::logScene, base::logWarning,
                        "bufferAdapter |{}| Missing `data` attribute in {}!", getName(),
                        buffer->getName());
    if (!data) {
        viewAll(*this, nullptr);
        viewedBuffer_ = nullptr;
        return;
    }
    const std::size_t size = data->size();
    const std::size_t offset = std::min<std::size_t>(scene::read(*this, n_inputOffset), size);
    const std::size_t length =
        std::min<std::size_t>(scene::read(*this, n_inputLength), size - offset);
    // The length counts from the start of the data, whatever the offset.
    const ByteRange bytes{data->data() + offset, length > offset ? length - offset : 0};
    viewAll(*this, &bytes);
    viewedBuffer_ = base::ref<base::IPlugin>(buffer);
}

} // namespace scene
