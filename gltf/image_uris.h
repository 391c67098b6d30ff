#pragma once

#include "GLTF/document.h"

namespace gltf {

/// Gives images with different data different uris, so that their files do not overwrite each
/// other, nor a picture that one of them was read from or that is among `sources`: behind the name
/// of the later one comes "_2", "_3" and so on. Capitals count as small letters. `folder` is where
/// the files will lie.
void makeUrisUnique(const base::vector<GLTF::Image*>& images,
                    const base::vector<base::string>& sources, const base::string& folder);

} // namespace gltf
