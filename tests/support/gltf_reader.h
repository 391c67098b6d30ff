#pragma once

#include "geometry.h"
#include "gltf_container.h"
#include "gltf_values.h"

#include <rapidjson/document.h>

#include <map>

namespace test_support {

/// A primitive with everything decoded.
struct Primitive {
    int mode = 4;
    int material = -1;
    bool compressed = false;
    std::map<std::string, AccessorValues> attributes;
    /// Counts up from 0 where the file has no indices.
    std::vector<uint32_t> indices;
    std::vector<std::map<std::string, AccessorValues>> targets;

    /// The indices of the triangles that a list, strip or fan of triangles draws.
    std::vector<std::array<uint32_t, 3>> triangles() const;
};

/// A node of the default scene at its place in the world.
struct NodeInstance {
    size_t node = 0;
    int mesh = -1;
    Matrix worldFromNode{};
};

/// A glTF file, read by code of its own that shares nothing with the exporter: a second opinion
/// for tests. Everything is checked against the bounds of what holds it; what goes wrong, now or
/// while something is decoded, throws `GltfError`. Sparse accessors are not read.
class GltfFile {
public:
    /// Reads a text file (.gltf) or, by the extension .glb, a container, and all its buffers.
    static GltfFile read(const std::filesystem::path& path);
    /// The same from memory; `folder` is where side files lie.
    static GltfFile fromText(std::string_view text, const std::filesystem::path& folder = {});
    static GltfFile fromBinary(std::span<const uint8_t> bytes,
                               const std::filesystem::path& folder = {});

    const rapidjson::Document& json() const { return json_; }
    const std::filesystem::path& folder() const { return folder_; }

    /// The element of a top-level array of the document, such as "nodes".
    const rapidjson::Value& element(const char* array, size_t index) const;
    /// The length of a top-level array, 0 if there is none.
    size_t count(const char* array) const;

    std::span<const uint8_t> bufferView(size_t index) const;
    /// The accessor's values as they lie in its buffer view. An accessor without one throws: the
    /// data of a compressed primitive is found by `primitive` alone.
    AccessorValues accessor(size_t index) const;
    /// Throws also if an index passes the vertices or an attribute differs in length.
    Primitive primitive(size_t mesh, size_t primitive) const;
    /// The transforms of all nodes relative to their parents, as the nodes themselves tell them.
    std::vector<Matrix> localMatrices() const;
    /// The nodes of the default scene, parents first. Throws if a node is met twice.
    std::vector<NodeInstance> instances() const { return instances(localMatrices()); }
    /// The same with other transforms relative to the parents, one for each node of the file.
    std::vector<NodeInstance> instances(const std::vector<Matrix>& localMatrices) const;

private:
    GltfFile(std::string_view text, std::optional<Bytes> binary,
             const std::filesystem::path& folder);

    void readCompressed(Primitive& result, const rapidjson::Value& object) const;
    void readPlain(Primitive& result, const rapidjson::Value& object) const;
    std::map<std::string, AccessorValues> readAttributes(const rapidjson::Value& object) const;

    std::filesystem::path folder_;
    rapidjson::Document json_;
    std::vector<Bytes> buffers_;
};

} // namespace test_support
