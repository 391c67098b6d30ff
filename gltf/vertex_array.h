#pragma once

#include "GLTF/document.h"
#include "b_factory.h"
#include "scene_attribute.h"

/// Vertex data on its way from the scene into the document.
namespace gltf {

/// True if the document may borrow the array that `map` has under `name`. One that belongs to
/// another object, reached by a link or by inheritance, may be replaced when that is converted;
/// buffer adapters alone never are.
bool mayBorrow(const base::AttribMap& map, base::name_id name);

/// `count` elements of `components` floats each: those of the scene as long as nothing has to
/// change, else a temporary of its own.
class VertexArray {
public:
    VertexArray() = default;
    VertexArray(const float* values, std::size_t count, std::size_t components, bool isShared)
        : values_(values), count_(count), components_(components), isShared_(isShared) {}
    VertexArray(VertexArray&&) = default;
    VertexArray& operator=(VertexArray&&) = default;

    /// True if there is such an array; it may be empty all the same.
    explicit operator bool() const { return values_ != nullptr; }
    const float* values() const { return values_; }
    const float* element(std::size_t index) const { return values_ + index * components_; }
    std::size_t count() const { return count_; }
    std::size_t components() const { return components_; }
    std::size_t valueCount() const { return count_ * components_; }
    /// True if the values will not last until the document is packed.
    bool mustCopy() const { return isShared_ || !own_.empty(); }
    void setShared() { isShared_ = true; }

    /// Puts other values in the place of the present ones.
    void replace(base::vector<float> values, std::size_t components);

private:
    const float* values_ = nullptr;
    std::size_t count_ = 0;
    std::size_t components_ = 0;
    bool isShared_ = false;
    base::vector<float> own_;
};

/// The array under `name` whose elements are one of `Ts`, all made of floats. An empty one counts
/// as absent, one of another type is logged.
template <class... Ts>
VertexArray findVertexArray(const base::AttribMap& map, base::name_id name) {
    VertexArray found;
    scene::visitVector<Ts...>(map, name, [&]<class T>(const base::vector<T>& elements) {
        if (!elements.empty())
            found = VertexArray(reinterpret_cast<const float*>(elements.data()), elements.size(),
                                sizeof(T) / sizeof(float), !mayBorrow(map, name));
    });
    return found;
}

/// True if no value is infinite or NaN.
bool isFinite(const float* values, std::size_t count);

/// Makes zeros of values that are not finite and says so in the log, with the object's name and
/// what the array holds. Returns whether there were any.
bool makeFinite(VertexArray& array, const base::IPlugin& object, base::string_view what);

/// True if the array is there with one element per vertex; one of another length is logged.
bool fitsVertices(const VertexArray& array, std::size_t vertexCount, const base::IPlugin& object,
                  base::string_view what);

/// `byteCount` as a length of the document. Throws `base::exception` if it passes 2^31 - 1, the
/// most that a document holds.
base::i32 checkedLength(base::u64 byteCount, const base::IPlugin& object);

/// A view of vertex data on the array itself or, if that will not last, on a copy.
base::ref<GLTF::BufferView> makeVertexView(const VertexArray& array, const base::IPlugin& object);
/// The same on a buffer of its own.
base::ref<GLTF::BufferView> makeVertexView(base::ref<GLTF::Buffer> buffer);

/// An accessor of floats, or of `componentType`, at the start of `view`.
base::ref<GLTF::Accessor> makeAccessor(GLTF::Accessor::Type type, std::size_t count,
                                       base::ref<GLTF::BufferView> view,
                                       base::i32 componentType = GLTF::componentFloat);

/// Declares `box` as the bounds of positions.
void setBounds(GLTF::Accessor& positions, const base::box3f& box);

} // namespace gltf
