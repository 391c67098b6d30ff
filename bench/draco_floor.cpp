#include "draco_floor.h"

#include <draco/compression/encode.h>
#include <draco/mesh/mesh.h>

#include <stdexcept>

namespace bench {

using draco::GeometryAttribute;

namespace {

template <class T>
void addAttribute(draco::Mesh& mesh, GeometryAttribute::Type kind, std::span<const T> values) {
    constexpr std::size_t components = sizeof(T) / sizeof(float);
    GeometryAttribute attribute;
    attribute.Init(kind, nullptr, components, draco::DT_FLOAT32, false, sizeof(T), 0);
    const int id = mesh.AddAttribute(attribute, true, static_cast<base::u32>(values.size()));
    mesh.attribute(id)->buffer()->Write(0, values.data(), values.size_bytes());
}

std::unique_ptr<draco::Mesh> makeMesh(const MeshArrays& arrays) {
    auto mesh = std::make_unique<draco::Mesh>();
    mesh->SetNumFaces(arrays.indices.size() / 3);
    for (base::u32 face = 0; face < mesh->num_faces(); ++face) {
        const base::u32* corners = &arrays.indices[std::size_t(face) * 3];
        mesh->SetFace(draco::FaceIndex(face),
                      {draco::PointIndex(corners[0]), draco::PointIndex(corners[1]),
                       draco::PointIndex(corners[2])});
    }
    mesh->set_num_points(static_cast<base::u32>(arrays.positions.size()));

    // As glTF has them: from the upper side on.
    base::vector<base::vec2f> uvs;
    uvs.reserve(arrays.uvs.size());
    for (const base::vec2f& uv : arrays.uvs)
        uvs.push_back({uv.x, 1 - uv.y});
    addAttribute(*mesh, GeometryAttribute::NORMAL, arrays.normals);
    addAttribute(*mesh, GeometryAttribute::POSITION, arrays.positions);
    addAttribute(*mesh, GeometryAttribute::TEX_COORD,
                 std::span<const base::vec2f>(uvs.data(), uvs.size()));
    return mesh;
}

} // namespace

DracoFloor::DracoFloor(const base::vector<MeshArrays>& meshes) {
    for (const MeshArrays& arrays : meshes)
        meshes_.push_back(makeMesh(arrays));
}

DracoFloor::~DracoFloor() = default;

std::size_t DracoFloor::encode() const {
    std::size_t byteCount = 0;
    for (const auto& mesh : meshes_) {
        draco::Encoder encoder;
        encoder.SetAttributeQuantization(GeometryAttribute::POSITION, 14);
        encoder.SetAttributeQuantization(GeometryAttribute::TEX_COORD, 10);
        encoder.SetAttributeQuantization(GeometryAttribute::NORMAL, 10);
        encoder.SetAttributeQuantization(GeometryAttribute::COLOR, 8);
        encoder.SetAttributeQuantization(GeometryAttribute::GENERIC, 8);
        draco::EncoderBuffer stream;
        if (!encoder.EncodeMeshToBuffer(*mesh, &stream).ok())
            throw std::runtime_error("the encoder failed");
        byteCount += stream.size();
    }
    return byteCount;
}

} // namespace bench
