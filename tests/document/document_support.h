#pragma once

#include "GLTF/json_text.h"
#include "GLTF/json_writer.h"

#include <gtest/gtest.h>

/// Builders of small documents and their text.
namespace document_test {

using namespace GLTF;
using base::makeRef;

/// The JSON object that an object of the document writes.
inline string written(Object& object, const Options& options = {}) {
    TextBuffer text;
    JsonWriter writer(text);
    writer.startObject();
    object.writeJSON(writer, options);
    writer.endObject();
    return {text.GetString(), text.GetSize()};
}

inline string documentText(Asset& asset, const Options& options = {}) {
    return string(JsonText(asset, options).view());
}

/// A view of a copy of the values.
template <class T>
ref<BufferView> viewOf(const std::vector<T>& values, i32 target = BufferView::arrayBuffer) {
    return makeRef<BufferView>(values.data(), static_cast<i32>(values.size() * sizeof(T)), target,
                               true);
}

inline ref<Node> namedNode(const string& name, std::vector<ref<Node>> children = {}) {
    auto node = makeRef<Node>();
    node->name = name;
    for (auto& child : children)
        node->children.push_back(child);
    return node;
}

inline string names(const vector<Node*>& nodes) {
    string text;
    for (const Node* node : nodes)
        text += node->name;
    return text;
}

/// A node with a mesh of one primitive.
inline ref<Node> meshNode(ref<Primitive> primitive) {
    auto node = makeRef<Node>();
    node->mesh = makeRef<Mesh>();
    node->mesh->primitives.push_back(primitive);
    return node;
}

} // namespace document_test
