#include "assimp/mesh_faces.h"

#include "scene_mesh_triangulate.h"

#include <assimp/mesh.h>

#include <algorithm>
#include <numeric>
#include <span>

namespace assimp {

using base::u16;
using base::u32;
using base::vec3f;

namespace {

bool hasThreePlaces(std::span<const u32> corners, const base::vector<vec3f>& positions) {
    const vec3f& first = positions[corners[0]];
    const vec3f* second = nullptr;
    for (const u32 corner : corners) {
        const vec3f& p = positions[corner];
        if (p == first)
            continue;
        if (!second)
            second = &p;
        else if (p != *second)
            return true;
    }
    return false;
}

/// Whether a polygon without equal neighbours encloses something, as far as equal places tell.
bool hasArea(std::span<const u32> corners, const base::vector<vec3f>& positions) {
    const auto at = [&](std::size_t i) -> const vec3f& { return positions[corners[i]]; };
    if (corners.size() == 4)
        return at(0) != at(2) && at(1) != at(3);
    return corners.size() > 2 && hasThreePlaces(corners, positions);
}

/// Sorts faces one by one.
class FaceCollector {
public:
    FaceCollector(const base::vector<vec3f>& positions, bool flip, MeshFaces& faces)
        : positions_(positions), flip_(flip), faces_(faces), used_(positions.size()) {}

    void add(std::span<const u32> corners) {
        const auto isBeyond = [&](u32 corner) { return corner >= positions_.size(); };
        if (corners.size() > 0xffff || std::ranges::any_of(corners, isBeyond))
            ++faces_.brokenCount;
        else if (corners.size() == 1)
            faces_.points.push_back(corners[0]);
        else if (corners.size() == 2)
            faces_.lines.append(corners.begin(), corners.end());
        else if (corners.size() > 2)
            addPolygon(corners);
    }

private:
    void addPolygon(std::span<const u32> corners) {
        base::vector<u32>& all = faces_.corners;
        const std::size_t start = all.size();
        for (const u32 corner : corners)
            if (all.size() == start || positions_[corner] != positions_[all.back()])
                all.push_back(corner);
        while (all.size() - start > 1 && positions_[all[start]] == positions_[all.back()])
            all.pop_back();

        const std::span<u32> kept(all.data() + start, all.size() - start);
        if (!hasArea(kept, positions_)) {
            all.resize(start);
            ++faces_.degenerateCount;
            return;
        }
        // The first corner stays the first.
        if (flip_)
            std::ranges::reverse(kept.subspan(1));
        faces_.cornerCounts.push_back(static_cast<u16>(kept.size()));
        for (const u32 corner : kept)
            faces_.sharesVertices |= used_[corner] != 0;
        for (const u32 corner : kept)
            used_[corner] = 1;
    }

    const base::vector<vec3f>& positions_;
    bool flip_;
    MeshFaces& faces_;
    base::vector<base::u8> used_; ///< by an earlier polygon
};

} // namespace

MeshFaces collectFaces(const aiMesh& mesh, const base::vector<vec3f>& positions, bool flip) {
    MeshFaces faces;
    if (mesh.mNumFaces == 0) {
        faces.points.resizeUninitialized(positions.size());
        std::iota(faces.points.begin(), faces.points.end(), 0u);
        return faces;
    }
    faces.corners.reserve(positions.size());
    faces.cornerCounts.reserve(mesh.mNumFaces);
    FaceCollector collector(positions, flip, faces);
    for (u32 i = 0; i < mesh.mNumFaces; ++i)
        collector.add({mesh.mFaces[i].mIndices, mesh.mFaces[i].mNumIndices});
    return faces;
}

namespace {

/// Takes polygons over into new lists, whole or in triangles.
class FaceCutter {
public:
    FaceCutter(MeshFaces& faces, const base::vector<vec3f>& positions, const base::string& name)
        : faces_(faces), triangulator_(positions, name), cornerOfVertex_(positions.size()) {
        corners_.reserve(faces.corners.size());
        counts_.reserve(faces.cornerCounts.size());
    }

    void add(std::span<const u32> polygon, bool keepsPolygons) {
        cut_.clear();
        const auto count = static_cast<u32>(polygon.size());
        const bool isPlain = triangulator_.triangulatePolygon(polygon.data(), count, cut_);
        if (count == 3 || (keepsPolygons && isPlain && cut_.size() == 3 * (count - 2)))
            addWhole(polygon);
        else
            addTriangles();
    }

    void finish() {
        faces_.corners = std::move(corners_);
        faces_.cornerCounts = std::move(counts_);
        if (faces_.corners.size() != triangles_.size())
            faces_.triangles = std::move(triangles_);
    }

private:
    void addWhole(std::span<const u32> polygon) {
        u32* cornerOf = cornerOfVertex_.data();
        for (const u32 vertex : polygon) {
            cornerOf[vertex] = static_cast<u32>(corners_.size());
            corners_.push_back(vertex);
        }
        counts_.push_back(static_cast<u16>(polygon.size()));
        for (const u32 vertex : std::as_const(cut_))
            triangles_.push_back(cornerOf[vertex]);
    }

    void addTriangles() {
        if (cut_.empty())
            ++faces_.degenerateCount;
        for (std::size_t i = 0; i < cut_.size(); ++i)
            triangles_.push_back(static_cast<u32>(corners_.size() + i));
        corners_.append(cut_.cbegin(), cut_.cend());
        counts_.resize(counts_.size() + cut_.size() / 3, u16(3));
    }

    MeshFaces& faces_;
    scene::PolygonTriangulator triangulator_;
    base::vector<u32> cornerOfVertex_; ///< in the polygon that was added last
    base::vector<u32> cut_;
    base::vector<u32> corners_;
    base::vector<u16> counts_;
    base::vector<u32> triangles_;
};

} // namespace

void cutFaces(MeshFaces& faces, const base::vector<vec3f>& positions, const base::string& name,
              bool keepsPolygons) {
    const base::vector<u16>& counts = faces.cornerCounts;
    if (std::ranges::all_of(counts, [](u16 count) { return count == 3; }))
        return;
    FaceCutter cutter(faces, positions, name);
    const u32* corners = faces.corners.cbegin();
    for (const u16 count : counts) {
        cutter.add({corners, count}, keepsPolygons);
        corners += count;
    }
    cutter.finish();
}

} // namespace assimp
