#include "GLTF/document.h"

#include "GLTF/json_writer.h"

#include "b_exception.h"
#include "b_format.h"

#include <draco/compression/encode.h>
#include <draco/mesh/mesh.h>

#include <algorithm>
#include <bit>
#include <cfloat>
#include <cmath>
#include <numeric>
#include <utility>

namespace GLTF {

namespace {

using draco::GeometryAttribute;

u32 nextPrime(u32 from) {
    const auto isPrime = [](u32 n) {
        for (u32 d = 2; d * d <= n; ++d) {
            if (n % d == 0)
                return false;
        }
        return true;
    };
    while (!isPrime(from))
        ++from;
    return from;
}

/// 32-bit FNV-1 over the bytes of the name.
u32 nameHash(string_view name) {
    u32 hash = 2166136261u;
    for (const char c : name)
        hash = hash * 16777619u ^ static_cast<u8>(c);
    return hash;
}

GeometryAttribute::Type attributeKind(string_view name) {
    if (name == "POSITION")
        return GeometryAttribute::POSITION;
    if (name == "NORMAL")
        return GeometryAttribute::NORMAL;
    if (name.starts_with("TEXCOORD"))
        return GeometryAttribute::TEX_COORD;
    if (name.starts_with("COLOR"))
        return GeometryAttribute::COLOR;
    return GeometryAttribute::GENERIC;
}

i64 dataByteLength(const Accessor& accessor) {
    return i64(accessor.count) * accessor.getNumberOfComponents() *
           accessor.getComponentByteLength();
}

const u8* dataOf(const Accessor& accessor) {
    return accessor.bufferView->buffer->data;
}

u32 floatBits(const u8* at) {
    u32 bits;
    std::memcpy(&bits, at, sizeof bits);
    return bits;
}

/// The bits of the largest magnitude, which order like the magnitudes; NaN and infinity come last.
u32 largestMagnitude(const u8* floats, i64 count) {
    u32 largest = 0;
    for (i64 i = 0; i < count; ++i)
        largest = std::max(largest, floatBits(floats + i * 4) & 0x7fffffffu);
    return largest;
}

/// True if all values are finite, and so is the difference between any two of one component.
bool isQuantizable(const Accessor& accessor) {
    constexpr u32 infinity = 0x7f800000u;
    const i64 components = accessor.getNumberOfComponents();
    const i64 valueCount = accessor.count * components;
    const u8* data = dataOf(accessor);
    const u32 largest = largestMagnitude(data, valueCount);
    if (largest >= infinity)
        return false;
    if (std::bit_cast<float>(largest) <= FLT_MAX / 2)
        return true;
    for (i64 c = 0; c < components; ++c) {
        float low = FLT_MAX, high = -FLT_MAX;
        for (i64 i = c; i < valueCount; i += components) {
            const float value = std::bit_cast<float>(floatBits(data + i * 4));
            low = std::min(low, value);
            high = std::max(high, value);
        }
        if (!std::isfinite(high - low))
            return false;
    }
    return true;
}

/// What keeps the encoder from taking an attribute of a mesh of `pointCount` points; empty if
/// nothing does.
string attributeFault(const string& name, const Accessor* accessor, i32 pointCount) {
    if (!accessor || !accessor->bufferView || !accessor->bufferView->buffer)
        return base::format("{} has no data", name);
    if (accessor->componentType != componentFloat && accessor->componentType != componentU16)
        return base::format("{} has components of type {}", name, accessor->componentType);
    const auto kind = attributeKind(name);
    const bool isVector = kind == GeometryAttribute::POSITION || kind == GeometryAttribute::NORMAL;
    if (isVector
            ? accessor->type != Accessor::Type::vec3 || accessor->componentType != componentFloat
            : accessor->getNumberOfComponents() == 0)
        return base::format("{} has elements of another kind than expected", name);
    if (accessor->count != pointCount)
        return base::format("{} has {} elements, POSITION has {}", name, accessor->count,
                            pointCount);
    if (dataByteLength(*accessor) > accessor->bufferView->buffer->byteLength)
        return base::format("{} has {} bytes of data, {} expected", name,
                            accessor->bufferView->buffer->byteLength, dataByteLength(*accessor));
    if (accessor->componentType == componentFloat && !isQuantizable(*accessor))
        return base::format("{} has values that are not finite or too far apart", name);
    return {};
}

string indexFault(const u32* indices, std::size_t indexCount, u32 pointCount) {
    const std::size_t cornerCount = indexCount / 3 * 3;
    const u32 largest = std::accumulate(indices, indices + cornerCount, u32(0),
                                        [](u32 a, u32 b) { return std::max(a, b); });
    if (cornerCount != 0 && largest >= pointCount)
        return base::format("index {} is out of range, there are {} vertices", largest, pointCount);
    for (std::size_t i = 0; i < cornerCount; i += 3) {
        if (indices[i] != indices[i + 1] && indices[i + 1] != indices[i + 2] &&
            indices[i] != indices[i + 2])
            return {};
    }
    return "no triangle has three distinct vertices";
}

string meshFault(const AttributeMap& attributes, const u32* indices, std::size_t indexCount) {
    const ref<Accessor>* position = attributes.get("POSITION");
    if (!position || !*position)
        return "POSITION is missing";
    const i32 pointCount = (*position)->count;
    if (pointCount < 1 || (!indices && pointCount < 3))
        return "there are too few vertices for a triangle";
    for (const auto& [name, accessor] : attributes) {
        if (string fault = attributeFault(name, accessor.get(), pointCount); !fault.empty())
            return fault;
    }
    return indices ? indexFault(indices, indexCount, static_cast<u32>(pointCount)) : string();
}

const u32* indicesIn(const Buffer* buffer) {
    return buffer ? reinterpret_cast<const u32*>(buffer->data) : nullptr;
}

void setFaces(draco::Mesh& mesh, const u32* indices, u32 cornerCount) {
    const u32 faceCount = cornerCount / 3;
    mesh.SetNumFaces(faceCount);
    for (u32 face = 0; face < faceCount; ++face) {
        draco::Mesh::Face corners;
        for (u32 c = 0; c < 3; ++c)
            corners[c] = indices ? indices[std::size_t(face) * 3 + c] : face * 3 + c;
        mesh.SetFace(draco::FaceIndex(face), corners);
    }
}

void addAttribute(draco::Mesh& mesh, GeometryAttribute::Type kind, i32 components,
                  i32 componentType, const u8* values) {
    const i64 stride = i64(components) * Accessor::componentByteLength(componentType);
    GeometryAttribute attribute;
    attribute.Init(kind, nullptr, static_cast<u8>(components),
                   componentType == componentU16 ? draco::DT_UINT16 : draco::DT_FLOAT32, false,
                   stride, 0);
    const i32 id = mesh.AddAttribute(attribute, true, mesh.num_points());
    mesh.attribute(id)->buffer()->Write(0, values,
                                        static_cast<std::size_t>(stride) * mesh.num_points());
}

} // namespace

void DracoAttributeIds::insert(string name, i32 id) {
    if (entries_.size() + 1 > bucketCount_) {
        bucketCount_ = nextPrime(2 * bucketCount_);
        for (Entry& entry : std::exchange(entries_, {}))
            place(std::move(entry));
    }
    const u32 hash = nameHash(name);
    place({std::move(name), id, hash});
}

/// To the front of its bucket.
void DracoAttributeIds::place(Entry entry) {
    const u32 bucket = entry.hash % bucketCount_;
    const auto isBefore = [&](const Entry& other) { return other.hash % bucketCount_ < bucket; };
    const auto at = std::find_if_not(entries_.cbegin(), entries_.cend(), isBefore);
    entries_.insert(at, std::move(entry));
}

i32 DracoAttributeIds::find(string_view name) const {
    for (const Entry& entry : entries_) {
        if (entry.name == name)
            return entry.id;
    }
    return -1;
}

DracoExtension::~DracoExtension() = default;

ref<DracoExtension> DracoExtension::make(const AttributeMap& attributes, ref<Buffer> indices,
                                         string& reason) {
    const std::size_t indexCount =
        indices ? static_cast<std::size_t>(indices->byteLength) / sizeof(u32) : 0;
    reason = meshFault(attributes, indicesIn(indices.get()), indexCount);
    if (!reason.empty())
        return nullptr;

    ref<DracoExtension> extension(new DracoExtension);
    extension->pointCount_ = static_cast<u32>((*attributes.get("POSITION"))->count);
    extension->indices_ = std::move(indices);
    extension->attributes_.reserve(attributes.size());
    for (const auto& [name, accessor] : attributes) {
        extension->attributeToId.insert(name, static_cast<i32>(extension->attributes_.size()));
        extension->attributes_.push_back({attributeKind(name), accessor->getNumberOfComponents(),
                                          accessor->componentType, accessor->bufferView->buffer});
    }
    return extension;
}

bool DracoExtension::encode(const Options& options) {
    draco::Mesh mesh;
    const u32* indices = indicesIn(indices_.get());
    setFaces(mesh, indices, indices ? static_cast<u32>(indices_->byteLength) / 4 : pointCount_);
    mesh.set_num_points(pointCount_);
    for (const Attribute& attribute : std::as_const(attributes_))
        addAttribute(mesh, static_cast<GeometryAttribute::Type>(attribute.kind),
                     attribute.components, attribute.componentType, attribute.values->data);

    draco::Encoder encoder;
    encoder.SetAttributeQuantization(GeometryAttribute::POSITION, options.positionBits);
    encoder.SetAttributeQuantization(GeometryAttribute::TEX_COORD, options.texCoordBits);
    encoder.SetAttributeQuantization(GeometryAttribute::NORMAL, options.normalBits);
    encoder.SetAttributeQuantization(GeometryAttribute::COLOR, options.colorBits);
    encoder.SetAttributeQuantization(GeometryAttribute::GENERIC, options.jointBits);
    draco::EncoderBuffer encoded;
    if (!encoder.EncodeMeshToBuffer(mesh, &encoded).ok())
        return false;
    if (encoded.size() > static_cast<std::size_t>(std::numeric_limits<i32>::max()))
        throw base::exception(
            base::format("Draco stream of {} bytes exceeds the 2147483647 bytes of a buffer",
                         encoded.size()),
            "draco", "GLTF::DracoExtension::encode", __LINE__);

    attributes_.clear();
    indices_.reset();
    bufferView = base::makeRef<BufferView>(encoded.data(), static_cast<i32>(encoded.size()),
                                           BufferView::noTarget, true);
    return true;
}

void DracoExtension::writeJSON(JsonWriter& writer, const Options&) {
    if (bufferView)
        writer.intMember("bufferView", bufferView->id);
    writer.startObject("attributes");
    for (const DracoAttributeIds::Entry& entry : attributeToId.entries()) {
        writer.keyText(entry.name);
        writer.intValue(entry.id);
    }
    writer.endObject();
}

} // namespace GLTF
