#pragma once

#include "b_attribute_map.h"

#include <memory>

/// The vertex arrays of a mesh and how its face corners address them.
namespace scene {

inline constexpr base::u32 noIndex = 0xffffffff;

struct Channel;
/// Makes the array that holds for each vertex what its first corner addresses. What lies past
/// the end of the array reads as zero and sets `outOfRange`.
using GatherFunction = std::unique_ptr<base::Attribute> (*)(
    const Channel& channel, const base::vector<base::u32>& firstCorner, bool& outOfRange);

/// One vertex array of the mesh or of one of its sets. All pointers borrow from the mesh.
struct Channel {
    base::AttribMap* owner = nullptr;
    base::name_id name;
    const void* data = nullptr;
    base::u32 count = 0;
    base::u32 wordCount = 0; ///< 32-bit words of an element
    bool isKey = true;       ///< tells vertices apart; velocities don't, they belong to positions
    const base::vector<base::u32>* ownIndices = nullptr; ///< its own index array, null if none
    base::u32 invalidIndex = noIndex; ///< index that stands for an element of zeros
    GatherFunction gather = nullptr;
    /// Entry of each corner in the array; null: the number of the corner itself.
    const base::u32* indexOfCorner = nullptr;

    base::u32 index(base::u32 corner) const {
        return indexOfCorner ? indexOfCorner[corner] : corner;
    }
    bool covers(base::u32 i) const { return i < count && i != invalidIndex; }
    /// True if every corner has an index, and each leads to an element.
    bool coversAll(base::u32 cornerCount) const;
};

/// The channels of `mesh` that hold something, positions first, without `indexOfCorner`. Joints
/// sets are no channels, their data have no fixed length.
base::vector<Channel> collectChannels(base::AttribMap& mesh);

/// An index array that is there and not empty, else null.
const base::vector<base::u32>* findIndices(const base::AttribMap& map, base::name_id name);

} // namespace scene
