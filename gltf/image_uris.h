#pragma once

#include "GLTF/document.h"
#include "gltf/source_files.h"

namespace gltf {

/// Gives images with different data different uris, so that their files in `folder` overwrite
/// neither each other nor one of `sources` or of `otherOutputs`: behind the name of the later one
/// comes "_2", "_3" and so on. Capitals count as small letters. An image may have the file that it
/// was read from for its own.
void makeUrisUnique(const base::vector<GLTF::Image*>& images, const SourceFiles& sources,
                    const base::vector<base::string>& otherOutputs, const base::string& folder);

} // namespace gltf
