#include "gltf/mesh_indices.h"

#include "gltf/vertex_array.h"

#include "scene_schema.h"

#include <algorithm>
#include <numeric>
#include <utility>

namespace gltf {

using base::ref;
using base::u32;
using base::u64;
using scene::mesh_schema;

MeshIndices::MeshIndices(const scene::IMesh& mesh) {
    const auto use = [&](const scene::SchemaAttribute<base::vector<u32>>& name) {
        const auto* array = find(mesh, name);
        if (!array || array->empty())
            return false;
        data_ = array->data();
        count_ = array->size();
        mustCopy_ = !mayBorrow(mesh, name);
        return true;
    };
    isTriangulated_ = use(mesh_schema::n_triIndices);
    // Only a mesh that could not be converted to single indices has position indices still.
    if (!isTriangulated_ && !use(mesh_schema::n_indices))
        use(mesh_schema::n_positionIndices);
    if (const auto* positions = find(mesh, mesh_schema::n_positions))
        vertexCount_ = static_cast<u32>(positions->size());
}

void MeshIndices::number() {
    own_.resizeUninitialized(vertexCount_);
    std::iota(own_.begin(), own_.end(), 0u);
    data_ = std::as_const(own_).data();
    count_ = own_.size();
    mustCopy_ = true;
}

ref<GLTF::BufferView> MeshIndices::makeView(const scene::IMesh& mesh) const {
    if (!data_)
        return nullptr;
    return base::makeRef<GLTF::BufferView>(data_, checkedLength(count_ * sizeof(u32), mesh),
                                           GLTF::BufferView::elementArrayBuffer, mustCopy_);
}

u64 MeshIndices::findOutOfRange() const {
    const u32 end = vertexCount_;
    return static_cast<u64>(
        std::find_if(data_, data_ + count_, [end](u32 index) { return index >= end; }) - data_);
}

} // namespace gltf
