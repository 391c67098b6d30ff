#include "assimp/manifold.h"

#include "assimp/mesh_faces.h"

#include <algorithm>
#include <numeric>
#include <span>
#include <utility>

namespace assimp {

using base::u32;
using base::u8;
using base::vector;

namespace {

/// Most sides of triangles at one edge that are matched; keeps the cost linear where many faces
/// hang on one edge. Faces at edges with more are not connected there.
constexpr u32 maxSidesMatched = 16;

/// Sides of triangles have the numbers of the triangles' corners where they begin.
u32 following(u32 side) {
    return side % 3 == 2 ? side - 2 : side + 1;
}
u32 preceding(u32 side) {
    return side % 3 == 0 ? side + 2 : side - 1;
}

/// The items in the order of their keys, which are below `keyCount`; those with equal keys stay in
/// the order they had.
template <class KeyOf>
vector<u32> sortedBy(const vector<u32>& items, u32 keyCount, const KeyOf& keyOf) {
    vector<u32> starts(std::size_t(keyCount) + 1);
    u32* start = starts.data();
    for (const u32 item : items)
        ++start[keyOf(item) + 1];
    for (std::size_t i = 1; i < keyCount; ++i)
        start[i] += start[i - 1];
    vector<u32> sorted;
    sorted.resizeUninitialized(items.size());
    u32* to = sorted.data();
    for (const u32 item : items)
        to[start[keyOf(item)]++] = item;
    return sorted;
}

/// Corners that belong together. The set is known by its first corner.
class CornerSets {
public:
    void reset(std::size_t count) {
        parents_.resizeUninitialized(count);
        std::iota(parents_.begin(), parents_.end(), 0u);
    }
    u32 find(u32 corner) {
        u32* parents = parents_.data();
        while (parents[corner] != corner)
            corner = parents[corner] = parents[parents[corner]];
        return corner;
    }
    void unite(u32 a, u32 b) {
        const auto [first, second] = std::minmax({find(a), find(b)});
        parents_[second] = first;
    }

private:
    vector<u32> parents_;
};

class FanSeparation {
public:
    FanSeparation(const vector<u32>& vertexOfCorner, u32 vertexCount, const MeshFaces& faces);

    /// Settles which corners form fans.
    void run() {
        sortSides();
        connectFaces();
        if (keepApartRepeated())
            connectFaces();
    }
    u32 numberFans(vector<u32>& vertexOfCorner);

private:
    using Sides = std::span<const u32>;

    void sortSides();
    void connectFaces();
    void connectMany(Sides edge);
    bool doMatch(u32 side, u32 other) const;
    void connect(u32 side, u32 other);
    bool keepApartRepeated();
    bool hasRepeated(Sides edge);
    void isolatePolygons();

    u32 cornerOf(u32 side) const { return corners_[side]; }
    u32 vertexOf(u32 side) const { return vertexOfCorner_[corners_[side]]; }

    const u32* vertexOfCorner_;
    u32 vertexCount_;
    std::size_t cornerCount_;
    const MeshFaces& faces_;
    vector<u32> cornerStorage_;
    const u32* corners_; ///< of the triangles
    u32 sideCount_;
    vector<u32> sides_;    ///< those of each edge, between the same two vertices, in a row
    vector<Sides> crowds_; ///< edges with more than two sides
    vector<u8> apart_;     ///< sides that connect nothing; empty as long as there are none
    CornerSets fans_;
};

FanSeparation::FanSeparation(const vector<u32>& vertexOfCorner, u32 vertexCount,
                             const MeshFaces& faces)
    : vertexOfCorner_(vertexOfCorner.data()), vertexCount_(vertexCount),
      cornerCount_(vertexOfCorner.size()), faces_(faces) {
    const vector<u32>* corners = &faces.triangles;
    if (corners->empty()) {
        cornerStorage_.resizeUninitialized(cornerCount_);
        std::iota(cornerStorage_.begin(), cornerStorage_.end(), 0u);
        corners = &cornerStorage_;
    }
    corners_ = corners->data();
    sideCount_ = static_cast<u32>(corners->size());
}

void FanSeparation::sortSides() {
    vector<u32> all;
    all.resizeUninitialized(sideCount_);
    std::iota(all.begin(), all.end(), 0u);
    all = sortedBy(all, vertexCount_,
                   [&](u32 side) { return std::max(vertexOf(side), vertexOf(following(side))); });
    sides_ = sortedBy(all, vertexCount_, [&](u32 side) {
        return std::min(vertexOf(side), vertexOf(following(side)));
    });
}

void FanSeparation::connectFaces() {
    fans_.reset(cornerCount_);
    crowds_.clear();
    const u32* sides = std::as_const(sides_).data();
    const auto edgeOf = [&](u32 i) {
        return std::minmax({vertexOf(sides[i]), vertexOf(following(sides[i]))});
    };
    for (u32 begin = 0, end = 0; begin < sideCount_; begin = end) {
        const std::pair<u32, u32> edge = edgeOf(begin);
        for (end = begin + 1; end < sideCount_ && edgeOf(end) == edge;)
            ++end;
        if (end - begin > 2)
            connectMany({sides + begin, sides + end});
        else if (end - begin == 2 && doMatch(sides[begin], sides[begin + 1]))
            connect(sides[begin], sides[begin + 1]);
    }
}

void FanSeparation::connectMany(Sides edge) {
    crowds_.push_back(edge);
    if (edge.size() > maxSidesMatched)
        return;
    bool isTaken[maxSidesMatched] = {};
    const auto match = [&](const auto& fits) {
        for (std::size_t i = 0; i < edge.size(); ++i)
            for (std::size_t k = i + 1; k < edge.size() && !isTaken[i]; ++k) {
                if (isTaken[k] || !fits(edge[i], edge[k]))
                    continue;
                isTaken[i] = isTaken[k] = true;
                connect(edge[i], edge[k]);
            }
    };
    // The diagonals of a polygon have no part in what lies around it.
    match([&](u32 side, u32 other) {
        return cornerOf(side) == cornerOf(following(other)) &&
               cornerOf(other) == cornerOf(following(side));
    });
    match([&](u32 side, u32 other) { return doMatch(side, other); });
}

/// For two sides of one edge.
bool FanSeparation::doMatch(u32 side, u32 other) const {
    return vertexOf(side) != vertexOf(other) &&
           vertexOf(preceding(side)) != vertexOf(preceding(other));
}

/// Sides that are marked use their match up nevertheless, so that a second pass connects nothing
/// that the first one did not.
void FanSeparation::connect(u32 side, u32 other) {
    if (!apart_.empty() && (std::as_const(apart_)[side] || std::as_const(apart_)[other]))
        return;
    fans_.unite(cornerOf(side), cornerOf(following(other)));
    fans_.unite(cornerOf(following(side)), cornerOf(other));
}

/// Two fans at one end of an edge may be one fan at the other end, and the fans at both ends may
/// meet a second time. Finds edges that would have several sides in one direction still and marks
/// what is not to be connected, so that a second pass parts them. False if there are none.
bool FanSeparation::keepApartRepeated() {
    for (const Sides edge : std::as_const(crowds_)) {
        if (edge.size() <= maxSidesMatched && !hasRepeated(edge))
            continue;
        if (apart_.empty())
            apart_.resize(sideCount_);
        for (const u32 side : edge)
            apart_[side] = 1;
    }
    if (apart_.empty())
        return false;
    isolatePolygons();
    return true;
}

bool FanSeparation::hasRepeated(Sides edge) {
    for (std::size_t i = 0; i < edge.size(); ++i)
        for (std::size_t k = i + 1; k < edge.size(); ++k)
            if (fans_.find(cornerOf(edge[i])) == fans_.find(cornerOf(edge[k])) &&
                fans_.find(cornerOf(following(edge[i]))) ==
                    fans_.find(cornerOf(following(edge[k]))))
                return true;
    return false;
}

/// The diagonals of polygons can't be parted without cutting these up. A polygon with a marked
/// diagonal is not connected to anything.
void FanSeparation::isolatePolygons() {
    u8* apart = apart_.data();
    u32 firstCorner = 0, firstSide = 0;
    for (const u32 count : faces_.cornerCounts) {
        const u32 lastCorner = firstCorner + count - 1;
        const u32 endSide = firstSide + 3 * (count - 2);
        const auto isMarkedDiagonal = [&](u32 side) {
            const u32 corner = cornerOf(side);
            const u32 next = corner == lastCorner ? firstCorner : corner + 1;
            return apart[side] && cornerOf(following(side)) != next;
        };
        for (u32 side = firstSide; count > 3 && side < endSide; ++side)
            if (isMarkedDiagonal(side)) {
                std::fill(apart + firstSide, apart + endSide, u8(1));
                break;
            }
        firstCorner = lastCorner + 1;
        firstSide = endSide;
    }
}

u32 FanSeparation::numberFans(vector<u32>& vertexOfCorner) {
    vector<u8> hasFan(vertexCount_);
    u8* taken = hasFan.data();
    u32* vertices = vertexOfCorner.data();
    u32 count = vertexCount_;
    for (u32 corner = 0; corner < cornerCount_; ++corner) {
        const u32 first = fans_.find(corner);
        if (first != corner)
            vertices[corner] = vertices[first];
        else if (std::exchange(taken[vertices[corner]], u8(1)))
            vertices[corner] = count++;
    }
    return count;
}

} // namespace

u32 separateFans(vector<u32>& vertexOfCorner, u32 vertexCount, const MeshFaces& faces) {
    FanSeparation separation(vertexOfCorner, vertexCount, faces);
    separation.run();
    return separation.numberFans(vertexOfCorner);
}

} // namespace assimp
