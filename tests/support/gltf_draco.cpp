#include "gltf_draco.h"

#include "gltf_container.h"

#include <draco/compression/decode.h>
#include <draco/mesh/mesh.h>

#include <string>

namespace test_support {

namespace {

/// glTF's number for the type of a component, 0 if it has none.
int componentTypeOf(draco::DataType type) {
    switch (type) {
    case draco::DT_INT8:
        return 5120;
    case draco::DT_UINT8:
        return 5121;
    case draco::DT_INT16:
        return 5122;
    case draco::DT_UINT16:
        return 5123;
    case draco::DT_UINT32:
        return 5125;
    case draco::DT_FLOAT32:
        return 5126;
    default:
        return 0;
    }
}

AccessorValues valuesOf(const draco::PointAttribute& attribute, uint32_t points) {
    const size_t components = attribute.num_components();
    AccessorValues result{componentTypeOf(attribute.data_type()), components, points, {}};
    result.values.resize(components * points);
    for (uint32_t point = 0; point < points; ++point) {
        const draco::AttributeValueIndex value = attribute.mapped_index(draco::PointIndex(point));
        if (!attribute.ConvertValue(value, static_cast<int8_t>(components),
                                    result.values.data() + point * components)) {
            throw GltfError("draco: unreadable attribute " + std::to_string(attribute.unique_id()));
        }
    }
    return result;
}

} // namespace

DracoMesh decodeDraco(std::span<const uint8_t> stream) {
    draco::DecoderBuffer buffer;
    buffer.Init(reinterpret_cast<const char*>(stream.data()), stream.size());
    draco::Decoder decoder;
    auto decoded = decoder.DecodeMeshFromBuffer(&buffer);
    if (!decoded.ok()) {
        throw GltfError(std::string("draco: ") + decoded.status().error_msg());
    }
    const draco::Mesh& mesh = *decoded.value();
    DracoMesh result{mesh.num_points(), {}, {}};
    for (draco::FaceIndex face(0); face < mesh.num_faces(); ++face) {
        for (const draco::PointIndex& corner : mesh.face(face)) {
            result.indices.push_back(corner.value());
        }
    }
    for (int32_t i = 0; i < mesh.num_attributes(); ++i) {
        const draco::PointAttribute& attribute = *mesh.attribute(i);
        result.attributes.emplace(attribute.unique_id(), valuesOf(attribute, mesh.num_points()));
    }
    return result;
}

} // namespace test_support
