#pragma once

#include "GLTF/document.h"

/// The JSON text of a document, in its two forms.
namespace GLTF {

/// Compact text: no white space. Holds the one copy of it.
class JsonText {
public:
    /// Writes `asset`, which can be done once per document.
    JsonText(Asset& asset, const Options& options);
    JsonText(const JsonText&) = delete;
    JsonText& operator=(const JsonText&) = delete;
    ~JsonText();

    string_view view() const noexcept;

private:
    struct Impl;
    std::unique_ptr<Impl> impl_;
};

/// Takes text piece by piece.
class TextSink {
public:
    virtual ~TextSink() = default;
    virtual void write(string_view piece) = 0;
};

/// Lays compact JSON text out for readers, in one pass and without a second copy. Names stand on
/// lines of their own, indented by one tab per level, with ": " before the value; arrays stay on
/// one line up to their closing bracket, which follows on a line of its own. Strings and numbers
/// are taken over letter by letter, so nothing changes its value.
/// `compact` must be well-formed and without white space.
void writePretty(string_view compact, TextSink& sink);

} // namespace GLTF
