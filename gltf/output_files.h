#pragma once

#include "GLTF/document.h"
#include "gltf/source_files.h"

namespace gltf {

/// Writes a packed document: the main file at `path` (text, or with `options.binary` a container)
/// and, in the same folder and under their uris, images and buffer that are not embedded. A file
/// that fails is logged and the next one is tried. Numbers the document, so it can be called once
/// per document. `buffer` is the document's; images that go into the container are added to it. No
/// image is written in the place of one of `sources`.
void writeOutputFiles(GLTF::Asset& asset, const GLTF::Options& options, GLTF::Buffer& buffer,
                      const SourceFiles& sources, const base::string& path);

} // namespace gltf
