#include "gltf_reader.h"

#include "gltf_draco.h"

#include <rapidjson/error/en.h>

#include <algorithm>
#include <cstring>
#include <numeric>

namespace test_support {

namespace {

using rapidjson::Value;

constexpr const char* dracoName = "KHR_draco_mesh_compression";

void require(bool condition, const std::string& text) {
    if (!condition) {
        throw GltfError(text);
    }
}

const Value* findMember(const Value& object, const char* name) {
    require(object.IsObject(), std::string("no object around \"") + name + "\"");
    const auto found = object.FindMember(name);
    return found == object.MemberEnd() ? nullptr : &found->value;
}

const Value& getMember(const Value& object, const char* name) {
    const Value* value = findMember(object, name);
    require(value, std::string("\"") + name + "\" is missing");
    return *value;
}

size_t toIndex(const Value& value, const std::string& name) {
    require(value.IsUint(), "\"" + name + "\" is no index or length");
    return value.GetUint();
}

size_t getIndex(const Value& object, const char* name) {
    return toIndex(getMember(object, name), name);
}

size_t findIndex(const Value& object, const char* name, size_t absent) {
    const Value* value = findMember(object, name);
    return value ? toIndex(*value, name) : absent;
}

int findInt(const Value& object, const char* name, int absent) {
    const Value* value = findMember(object, name);
    require(!value || value->IsInt(), std::string("\"") + name + "\" is no integer");
    return value ? value->GetInt() : absent;
}

template <size_t N>
std::array<double, N> findNumbers(const Value& object, const char* name,
                                  const std::array<double, N>& absent) {
    const Value* value = findMember(object, name);
    if (!value) {
        return absent;
    }
    require(value->IsArray() && value->Size() == N, std::string("wrong length of ") + name);
    std::array<double, N> numbers;
    for (rapidjson::SizeType i = 0; i < N; ++i) {
        require((*value)[i].IsNumber(), std::string("no number in ") + name);
        numbers[i] = (*value)[i].GetDouble();
    }
    return numbers;
}

/// How the elements of an accessor lie in memory.
struct Layout {
    int componentType;
    size_t componentSize;
    size_t columns;
    size_t rows;
    size_t columnStride;
    bool normalized;
    size_t count;

    size_t components() const { return columns * rows; }
    size_t elementSize() const { return columns * columnStride; }
};

size_t sizeOfComponent(int componentType) {
    switch (componentType) {
    case 5120:
    case 5121:
        return 1;
    case 5122:
    case 5123:
        return 2;
    case 5125:
    case 5126:
        return 4;
    default:
        throw GltfError("component type " + std::to_string(componentType));
    }
}

Layout layoutOf(const Value& accessor) {
    struct Shape {
        const char* type;
        size_t columns;
        size_t rows;
    };
    constexpr Shape shapes[] = {{"SCALAR", 1, 1}, {"VEC2", 1, 2}, {"VEC3", 1, 3}, {"VEC4", 1, 4},
                                {"MAT2", 2, 2},   {"MAT3", 3, 3}, {"MAT4", 4, 4}};
    const Value& type = getMember(accessor, "type");
    const auto* shape = std::find_if(std::begin(shapes), std::end(shapes), [&](const Shape& s) {
        return type.IsString() && std::string_view(type.GetString()) == s.type;
    });
    require(shape != std::end(shapes), "unknown accessor type");

    Layout layout{};
    layout.componentType = findInt(accessor, "componentType", 0);
    layout.componentSize = sizeOfComponent(layout.componentType);
    layout.columns = shape->columns;
    layout.rows = shape->rows;
    layout.columnStride = shape->rows * layout.componentSize;
    if (shape->columns > 1) {
        // Each column of a matrix starts at a multiple of four bytes.
        layout.columnStride = (layout.columnStride + 3) / 4 * 4;
    }
    const Value* normalized = findMember(accessor, "normalized");
    layout.normalized = normalized && normalized->IsTrue();
    layout.count = getIndex(accessor, "count");
    return layout;
}

template <typename T>
double readAs(const uint8_t* data) {
    T value;
    std::memcpy(&value, data, sizeof(T));
    return static_cast<double>(value);
}

double readComponent(int componentType, const uint8_t* data) {
    switch (componentType) {
    case 5120:
        return readAs<int8_t>(data);
    case 5121:
        return readAs<uint8_t>(data);
    case 5122:
        return readAs<int16_t>(data);
    case 5123:
        return readAs<uint16_t>(data);
    case 5125:
        return readAs<uint32_t>(data);
    default:
        return readAs<float>(data);
    }
}

void normalize(AccessorValues& values) {
    double largest = 1;
    switch (values.componentType) {
    case 5120:
        largest = 127;
        break;
    case 5121:
        largest = 255;
        break;
    case 5122:
        largest = 32767;
        break;
    case 5123:
        largest = 65535;
        break;
    default:
        throw GltfError("normalised values of type " + std::to_string(values.componentType));
    }
    for (double& value : values.values) {
        value = std::max(value / largest, -1.0);
    }
}

AccessorValues readValues(const Layout& layout, std::span<const uint8_t> view, size_t offset,
                          size_t stride) {
    AccessorValues result{layout.componentType, layout.components(), layout.count, {}};
    const size_t last = layout.count > 0 ? (layout.count - 1) * stride + layout.elementSize() : 0;
    require(offset + last <= view.size(), "ends at byte " + std::to_string(offset + last) +
                                              " of a view of " + std::to_string(view.size()));
    result.values.reserve(layout.components() * layout.count);
    for (size_t i = 0; i < layout.count; ++i) {
        for (size_t c = 0; c < layout.components(); ++c) {
            const size_t within =
                c / layout.rows * layout.columnStride + c % layout.rows * layout.componentSize;
            result.values.push_back(
                readComponent(layout.componentType, view.data() + offset + i * stride + within));
        }
    }
    return result;
}

constexpr Matrix identity{1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1};

Matrix localMatrix(const Value& node) {
    if (findMember(node, "matrix")) {
        return findNumbers<16>(node, "matrix", identity);
    }
    return toMatrix({findNumbers<3>(node, "translation", {0, 0, 0}),
                     findNumbers<4>(node, "rotation", {0, 0, 0, 1}),
                     findNumbers<3>(node, "scale", {1, 1, 1})});
}

/// Runs `action` and puts `place` in front of the text of what it throws.
template <typename Action>
auto at(const std::string& place, Action action) {
    try {
        return action();
    } catch (const GltfError& error) {
        throw GltfError(place + ": " + error.what());
    }
}

std::string placeOf(const char* array, size_t index) {
    return std::string("/") + array + "/" + std::to_string(index);
}

} // namespace

std::vector<std::array<uint32_t, 3>> Primitive::triangles() const {
    std::vector<std::array<uint32_t, 3>> result;
    const std::vector<uint32_t>& i = indices;
    if (mode == 4) {
        for (size_t k = 0; k + 2 < i.size(); k += 3) {
            result.push_back({i[k], i[k + 1], i[k + 2]});
        }
    } else if (mode == 5) {
        for (size_t k = 0; k + 2 < i.size(); ++k) {
            result.push_back({i[k], i[k + 1 + k % 2], i[k + 2 - k % 2]});
        }
    } else if (mode == 6) {
        for (size_t k = 1; k + 1 < i.size(); ++k) {
            result.push_back({i[0], i[k], i[k + 1]});
        }
    }
    return result;
}

GltfFile GltfFile::read(const std::filesystem::path& path) {
    return at(path.string(), [&] {
        const Bytes bytes = readBytes(path);
        if (path.extension() == ".glb") {
            return fromBinary(bytes, path.parent_path());
        }
        return fromText({reinterpret_cast<const char*>(bytes.data()), bytes.size()},
                        path.parent_path());
    });
}

GltfFile GltfFile::fromText(std::string_view text, const std::filesystem::path& folder) {
    return GltfFile(text, std::nullopt, folder);
}

GltfFile GltfFile::fromBinary(std::span<const uint8_t> bytes, const std::filesystem::path& folder) {
    GltfChunks chunks = splitGlb(bytes);
    return GltfFile(chunks.json, std::move(chunks.binary), folder);
}

GltfFile::GltfFile(std::string_view text, std::optional<Bytes> binary,
                   const std::filesystem::path& folder)
    : folder_(folder) {
    json_.Parse<rapidjson::kParseFullPrecisionFlag | rapidjson::kParseIterativeFlag |
                rapidjson::kParseValidateEncodingFlag>(text.data(), text.size());
    require(!json_.HasParseError(), std::string("JSON: ") +
                                        rapidjson::GetParseError_En(json_.GetParseError()) +
                                        " at byte " + std::to_string(json_.GetErrorOffset()));
    require(json_.IsObject(), "JSON: the document is no object");

    for (size_t i = 0; i < count("buffers"); ++i) {
        buffers_.push_back(at(placeOf("buffers", i), [&] {
            const Value& object = element("buffers", i);
            const size_t length = getIndex(object, "byteLength");
            const Value* uri = findMember(object, "uri");
            require(uri ? uri->IsString() : i == 0 && binary, "neither uri nor BIN chunk");
            Bytes bytes = uri ? readUri({uri->GetString(), uri->GetStringLength()}, folder)
                              : std::move(*binary);
            require(length <= bytes.size(), "byteLength " + std::to_string(length) + ", found " +
                                                std::to_string(bytes.size()));
            // A chunk is filled up with zeros; everything else has exactly the length.
            const size_t padding = uri ? 0 : (4 - length % 4) % 4;
            require(bytes.size() - length == padding, "wrong number of bytes behind the content");
            require(std::count(bytes.end() - static_cast<ptrdiff_t>(padding), bytes.end(), 0) ==
                        static_cast<ptrdiff_t>(padding),
                    "padding that is not zero");
            bytes.resize(length);
            return bytes;
        }));
    }
}

size_t GltfFile::count(const char* array) const {
    const Value* value = findMember(json_, array);
    require(!value || value->IsArray(), std::string("/") + array + " is no array");
    return value ? value->Size() : 0;
}

const Value& GltfFile::element(const char* array, size_t index) const {
    require(index < count(array), placeOf(array, index) + " does not exist");
    return json_[array][static_cast<rapidjson::SizeType>(index)];
}

std::span<const uint8_t> GltfFile::bufferView(size_t index) const {
    return at(placeOf("bufferViews", index), [&] {
        const Value& object = element("bufferViews", index);
        const size_t buffer = getIndex(object, "buffer");
        require(buffer < buffers_.size(), placeOf("buffers", buffer) + " does not exist");
        const size_t offset = findIndex(object, "byteOffset", 0);
        const size_t length = getIndex(object, "byteLength");
        require(offset + length <= buffers_[buffer].size(), "passes the end of its buffer");
        return std::span<const uint8_t>(buffers_[buffer]).subspan(offset, length);
    });
}

AccessorValues GltfFile::accessor(size_t index) const {
    return at(placeOf("accessors", index), [&] {
        const Value& object = element("accessors", index);
        const Layout layout = layoutOf(object);
        require(!findMember(object, "sparse"), "sparse accessors are not read");
        require(findMember(object, "bufferView"), "has no data of its own");
        const size_t view = getIndex(object, "bufferView");
        const std::span<const uint8_t> bytes = bufferView(view);
        const size_t stride =
            findIndex(element("bufferViews", view), "byteStride", layout.elementSize());
        require(stride >= layout.elementSize(), "the stride is shorter than an element");
        AccessorValues result =
            readValues(layout, bytes, findIndex(object, "byteOffset", 0), stride);
        if (layout.normalized) {
            normalize(result);
        }
        return result;
    });
}

std::map<std::string, AccessorValues> GltfFile::readAttributes(const Value& object) const {
    std::map<std::string, AccessorValues> result;
    require(object.IsObject(), "attributes that are no object");
    for (const auto& member : object.GetObject()) {
        result.emplace(member.name.GetString(), accessor(toIndex(member.value, "attributes")));
    }
    return result;
}

void GltfFile::readPlain(Primitive& result, const Value& object) const {
    result.attributes = readAttributes(getMember(object, "attributes"));
    if (findMember(object, "indices")) {
        const AccessorValues indices = accessor(getIndex(object, "indices"));
        const int type = indices.componentType;
        require(indices.components == 1 && (type == 5121 || type == 5123 || type == 5125),
                "indices that are no unsigned integers");
        for (const double index : indices.values) {
            result.indices.push_back(static_cast<uint32_t>(index));
        }
    } else if (!result.attributes.empty()) {
        result.indices.resize(result.attributes.begin()->second.count);
        std::iota(result.indices.begin(), result.indices.end(), 0U);
    }
}

void GltfFile::readCompressed(Primitive& result, const Value& object) const {
    const Value& extension = getMember(getMember(object, "extensions"), dracoName);
    DracoMesh mesh = decodeDraco(bufferView(getIndex(extension, "bufferView")));
    result.compressed = true;
    result.indices = std::move(mesh.indices);
    const Value& accessors = getMember(object, "attributes");
    const Value& ids = getMember(extension, "attributes");
    require(accessors.IsObject() && ids.IsObject(), "attributes that are no object");
    require(accessors.MemberCount() == ids.MemberCount(),
            "the extension names other attributes than the primitive");
    for (const auto& member : ids.GetObject()) {
        const char* name = member.name.GetString();
        const auto found = mesh.attributes.find(
            static_cast<uint32_t>(toIndex(member.value, std::string("the id of ") + name)));
        require(found != mesh.attributes.end(), std::string("the stream lacks ") + name);
        AccessorValues& values = found->second;
        const Layout layout = layoutOf(element("accessors", getIndex(accessors, name)));
        require(values.components == layout.components() &&
                    values.componentType == layout.componentType,
                std::string(name) + " has another type in the stream than in its accessor");
        if (layout.normalized) {
            normalize(values);
        }
        result.attributes.emplace(name, values);
    }
}

Primitive GltfFile::primitive(size_t mesh, size_t primitive) const {
    return at(placeOf("meshes", mesh) + placeOf("primitives", primitive), [&] {
        const Value& primitives = getMember(element("meshes", mesh), "primitives");
        require(primitives.IsArray() && primitive < primitives.Size(), "does not exist");
        const Value& object = primitives[static_cast<rapidjson::SizeType>(primitive)];
        Primitive result;
        result.mode = findInt(object, "mode", 4);
        result.material = findInt(object, "material", -1);
        const Value* extensions = findMember(object, "extensions");
        if (extensions && findMember(*extensions, dracoName)) {
            readCompressed(result, object);
        } else {
            readPlain(result, object);
        }
        if (const Value* targets = findMember(object, "targets")) {
            require(targets->IsArray(), "targets that are no array");
            for (const Value& target : targets->GetArray()) {
                result.targets.push_back(readAttributes(target));
            }
        }
        const size_t vertices =
            result.attributes.empty() ? 0 : result.attributes.begin()->second.count;
        for (const auto& [name, values] : result.attributes) {
            require(values.count == vertices, name + " has another count than the rest");
        }
        for (const uint32_t index : result.indices) {
            require(index < vertices, "index " + std::to_string(index) + " of " +
                                          std::to_string(vertices) + " vertices");
        }
        return result;
    });
}

std::vector<Matrix> GltfFile::localMatrices() const {
    std::vector<Matrix> result;
    for (size_t i = 0; i < count("nodes"); ++i) {
        result.push_back(at(placeOf("nodes", i), [&] { return localMatrix(element("nodes", i)); }));
    }
    return result;
}

std::vector<NodeInstance> GltfFile::instances(const std::vector<Matrix>& localMatrices) const {
    std::vector<NodeInstance> result;
    std::vector<bool> met(count("nodes"), false);
    std::vector<std::pair<size_t, Matrix>> open;
    const auto push = [&](const Value* nodes, const Matrix& parent) {
        require(!nodes || nodes->IsArray(), "a list of nodes that is no array");
        for (rapidjson::SizeType i = nodes ? nodes->Size() : 0; i-- > 0;) {
            open.emplace_back(toIndex((*nodes)[i], "node"), parent);
        }
    };
    if (count("scenes") > 0) {
        push(findMember(element("scenes", findIndex(json_, "scene", 0)), "nodes"), identity);
    }
    while (!open.empty()) {
        const auto [index, worldFromParent] = open.back();
        open.pop_back();
        const Value& node = element("nodes", index);
        require(!met[index], placeOf("nodes", index) + " has two parents");
        met[index] = true;
        const Matrix world = worldFromParent * localMatrices.at(index);
        result.push_back({index, findInt(node, "mesh", -1), world});
        push(findMember(node, "children"), world);
    }
    return result;
}

} // namespace test_support
