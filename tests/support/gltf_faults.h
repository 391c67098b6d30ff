#pragma once

#include "gltf_reader.h"

namespace test_support {

/// Something that a document declares and its data does not hold, though it can be decoded.
struct Fault {
    /// What kind it is, for comparisons:
    /// "draco-count": a compressed stream has other vertices or indices than its accessors say;
    /// "limits": the smallest or largest value of an accessor differs from the declared one;
    /// "not-finite": an infinite value or none; "alignment": an accessor starts at an offset that
    /// is no multiple of its component's size; "image": an image is empty or
    /// can't be read.
    std::string kind;
    /// Where, what is declared and what is found.
    std::string text;
};

/// Decodes all accessors, primitives and references to images. Throws `GltfError` as the reader.
std::vector<Fault> findFaults(const GltfFile& file);

} // namespace test_support
