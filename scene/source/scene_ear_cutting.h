#pragma once

#include "scene_point_tree.h"

/// Triangulation of outlines of any kind by cutting off ears.
namespace scene {

/// Cuts one outline after another; keeps its working memory between them.
///
/// An ear is a corner that turns to the left and whose triangle holds no corner that does not.
/// Simple outlines are cut up wholly, also those that touch themselves or run along a bridge to
/// a hole and back. In outlines that cross themselves the loops that turn to the right are cut as
/// well, as if they were mirrored.
class EarCutter {
public:
    /// Appends triangles, all turning to the left, of an outline that as a whole turns to the
    /// left. Corners that are no farther than `precision` from an edge count as on it. False if a
    /// full turn round the rest of the outline finds no ear, or if the search takes too long for
    /// the number of corners.
    bool cut(std::span<const base::vec2d> outline, double precision,
             base::vector<Triangle>& triangles);
    /// The corners that the last `cut` left over, in order.
    base::vector<base::u32> remainingCorners() const;

private:
    struct Search;
    void link();
    void measure(base::u32 corner);
    void queueAll();
    bool isEar(base::u32 corner, const Search& search);
    bool isBlocked(base::u32 corner, const Search& search);
    bool isSpike(base::u32 corner) const;
    void cutOff(base::u32 ear, base::vector<Triangle>& triangles);

    struct Corner {
        base::u32 previous, next;
        double turn; ///< of the corner's own triangle
        bool isCut;
    };
    std::span<const base::vec2d> points_;
    base::vector<Corner> corners_;
    base::u32 first_ = 0; ///< one of the corners that are left
    base::u32 remaining_ = 0;
    double flatTurn_ = 0; ///< turns up to this are rounding
    double precision_ = 0;
    base::u64 work_ = 0;
    PointTree tree_;
    base::vector<base::u32> queue_;
    std::size_t queueHead_ = 0;
};

} // namespace scene
