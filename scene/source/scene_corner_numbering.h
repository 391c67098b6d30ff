#pragma once

#include "b_containers.h"
#include "b_types.h"

#include <span>

/// Which corners of a mesh are one vertex: numbering of keys by first appearance.
namespace scene {

/// The numbers given to the corners, and for each number the corner that had it first.
struct CornerNumbering {
    base::vector<base::u32> vertexOfCorner;
    base::vector<base::u32> firstCorner;
};

/// Numbers the corners by their keys, from 0 in the order of first appearance. The key of corner
/// c is the c-th entry of every column; the columns are borrowed and all hold `cornerCount`
/// entries, those of the first are below `firstColumnBound`. A long run reports its progress
/// under `name`.
CornerNumbering numberCorners(std::span<const base::u32* const> columns, base::u32 cornerCount,
                              base::u32 firstColumnBound, const base::string& name);

/// Numbers `count` elements of `wordCount` (1 to 4) 32-bit words by their bytes, from 0 in the
/// order of first appearance. One more entry answers for the element of zeros. Empty if no two
/// elements are equal and none is zero.
base::vector<base::u32> numberEqual(const void* elements, base::u32 wordCount, base::u32 count);

} // namespace scene
