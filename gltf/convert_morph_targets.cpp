#include "gltf/exporter.h"
#include "gltf/vertex_array.h"

#include "b_log.h"
#include "scene_mesh_index.h"
#include "scene_schema.h"

#include <algorithm>

namespace gltf {

using base::log;
using base::logScene;
using base::name_id;
using base::ref;
using base::string_view;
using base::u32;
using scene::mesh_schema;
using Type = GLTF::Accessor::Type;

namespace {

using Indices = base::vector<u32>;

/// Reads the channels of a morph target in the order of the vertices of its base.
class TargetReader {
public:
    TargetReader(const GLTF::Mesh& gltfMesh, const scene::IMesh& target, const scene::IMesh& base,
                 bool isWholeShape)
        : attributes_(gltfMesh.primitives[0]->attributes), target_(target),
          origins_(findVertexOrigins(base)), baseIndices_(find(base, mesh_schema::n_indices)),
          isWholeShape_(isWholeShape) {}

    /// The differences to the attribute `key` of the base, x, y and z. `indices` names the index
    /// array that the target may have for the channel. Nothing, with a message, if the two do
    /// not fit together.
    template <class... Ts>
    VertexArray read(const scene::SchemaAttribute<base::vector<u32>>& indices, name_id name,
                     string_view key);
    /// True if the values read last are not those of the scene's object alone.
    bool isChanged() const { return isChanged_; }

private:
    const Indices* findCornerIndices(const scene::SchemaAttribute<Indices>& name) const;
    base::vector<float> gather(const VertexArray& array, const Indices* cornerIndices,
                               std::size_t vertexCount) const;
    void log(int level, string_view text, name_id name) const;

    const GLTF::AttributeMap& attributes_;
    const scene::IMesh& target_;
    scene::VertexOrigins origins_;
    const Indices* baseIndices_;
    bool isWholeShape_;
    bool isChanged_ = false;
};

/// The elements of the corners; null where the positions' own order counts. A base that got new
/// vertices had corners that its targets have too.
const Indices* TargetReader::findCornerIndices(const scene::SchemaAttribute<Indices>& name) const {
    const Indices* own = find(target_, name);
    if (own && !own->empty())
        return own;
    const Indices* shared = find(target_, mesh_schema::n_indices);
    return shared && baseIndices_ && shared->size() == baseIndices_->size() ? shared : nullptr;
}

/// The first three components of each vertex's element; empty if one is missing.
base::vector<float> TargetReader::gather(const VertexArray& array, const Indices* cornerIndices,
                                         std::size_t vertexCount) const {
    base::vector<float> values;
    values.resizeUninitialized(3 * vertexCount);
    float* out = values.data();
    for (std::size_t v = 0; v < vertexCount; ++v) {
        std::size_t element = v;
        if (cornerIndices) {
            const u32 corner = (*origins_.corners)[v];
            element = corner < cornerIndices->size() ? (*cornerIndices)[corner] : array.count();
        } else if (origins_.positions) {
            element = (*origins_.positions)[v];
        }
        if (element >= array.count())
            return {};
        out = std::copy_n(array.element(element), 3, out);
    }
    return values;
}

void TargetReader::log(int level, string_view text, name_id name) const {
    base::log().log(logScene, level, text, target_.getName(), name);
}

/// Takes the values of `base` off `values`, both x, y, z and as many as `values` has.
void subtract(base::vector<float>& values, const GLTF::Accessor& base) {
    const base::u8* from = base.bufferView->buffer->data;
    for (float* to = values.begin(); to != values.end(); to += 3, from += base.getByteStride()) {
        const auto* b = reinterpret_cast<const float*>(from);
        for (std::size_t c = 0; c < 3; ++c)
            to[c] -= b[c];
    }
}

template <class... Ts>
VertexArray TargetReader::read(const scene::SchemaAttribute<Indices>& indices, name_id name,
                               string_view key) {
    VertexArray array = findVertexArray<Ts...>(target_, name);
    if (!array)
        return {};
    const ref<GLTF::Accessor>* base = attributes_.get(key);
    if (!base) {
        log(base::logWarning,
            "gltf |{}| The morph target has '{}', its base has none, the data is left out!", name);
        return {};
    }
    const auto vertexCount = static_cast<std::size_t>((*base)->count);
    const Indices* cornerIndices = origins_.corners ? findCornerIndices(indices) : nullptr;
    if (!origins_.corners && !fitsVertices(array, vertexCount, target_, name.view()))
        return {};
    base::vector<float> values = gather(array, cornerIndices, vertexCount);
    if (values.empty()) {
        log(base::logError,
            "gltf |{}| The morph target has too few elements in '{}', the data is left out!", name);
        return {};
    }
    if (isWholeShape_)
        subtract(values, **base);
    array.replace(std::move(values), 3);
    isChanged_ = makeFinite(array, target_, name.view()) || isWholeShape_;
    return array;
}

/// The mesh's primitives share one compressed stream, which has no room for targets.
void dropCompression(GLTF::Mesh& gltfMesh, const scene::IMesh& mesh) {
    bool isDropped = false;
    for (const ref<GLTF::Primitive>& primitive : gltfMesh.primitives)
        isDropped |= primitive->extensions.erase(GLTF::dracoExtensionName);
    if (isDropped)
        log().log(logScene, base::logInformation,
                  "gltf |{}| The mesh has morph targets, it is not compressed.", mesh.getName());
}

} // namespace

bool GLTFScenePlugin::convertMorphTarget(GLTF::Mesh& gltfMesh, const scene::IMesh& targetMesh,
                                         const scene::IMesh& baseMesh, bool isWholeShape) {
    if (gltfMesh.primitives.empty())
        return false;
    TargetReader reader(std::as_const(gltfMesh), targetMesh, baseMesh, isWholeShape);
    const VertexArray positions = reader.read<base::vec3f>(mesh_schema::n_positionIndices,
                                                           mesh_schema::n_positions, "POSITION");
    if (!positions)
        return false;
    const auto makeChannel = [&](const VertexArray& array) -> ref<GLTF::Accessor> {
        if (!array)
            return nullptr;
        return makeAccessor(Type::vec3, array.count(), makeVertexView(array, targetMesh));
    };
    const auto position = makeChannel(positions);
    if (reader.isChanged())
        position->computeMinMax();
    else
        setBounds(*position, targetMesh.getBounds());

    ref<GLTF::Accessor> normal, tangent;
    const VertexArray normals = reader.read<base::normal, base::vec3f>(
        mesh_schema::n_normalIndices, mesh_schema::n_normals, "NORMAL");
    normal = makeChannel(normals);
    if (normals)
        tangent = makeChannel(reader.read<base::vec4f, base::vec3f>(
            mesh_schema::n_tangentIndices, mesh_schema::n_tangents, "TANGENT"));

    dropCompression(gltfMesh, baseMesh);
    for (const ref<GLTF::Primitive>& primitive : gltfMesh.primitives) {
        auto target = base::makeRef<GLTF::Primitive::Target>();
        target->attributes["POSITION"] = position;
        if (normal)
            target->attributes["NORMAL"] = normal;
        if (tangent)
            target->attributes["TANGENT"] = tangent;
        primitive->targets.push_back(std::move(target));
    }
    return true;
}

} // namespace gltf
