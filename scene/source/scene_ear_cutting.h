#pragma once

#include "scene_plane.h"

/// Triangulation of outlines of any kind by cutting off ears.
namespace scene {

/// The points of an outline sorted into the cells of a grid, for the question which of them lie
/// in or near a triangle.
class PointGrid {
public:
    struct Item {
        base::vec2d point;
        base::u32 corner;
    };
    void build(std::span<const base::vec2d> points);
    /// Calls `use` with runs of items, among them all that are in the triangle or within `margin`
    /// of it, until it answers true; returns whether it did.
    template <class Use>
    bool anyRun(const std::array<base::vec2d, 3>& triangle, double margin, Use use) const;
    /// Greater of the sides of the box round all points.
    double extent() const { return extent_; }

private:
    base::u32 column(double x) const;
    base::u32 row(double y) const;

    base::vec2d min_;
    double extent_ = 0;
    double cellSize_ = 0;
    base::u32 columnCount_ = 1, rowCount_ = 1;
    base::vector<base::u32> starts_; ///< of each cell in `items_`, row by row, and the end
    base::vector<Item> items_;
};

/// Cuts one outline after another; keeps its working memory between them.
///
/// An ear is a corner that turns to the left and whose triangle holds no corner that does not.
/// Simple outlines are cut up wholly, also those that touch themselves or run along a bridge to
/// a hole and back. In outlines that cross themselves the loops that turn to the right are cut as
/// well, as if they were mirrored.
class EarCutter {
public:
    /// Appends triangles, all turning to the left, of an outline that as a whole turns to the
    /// left. False if a full turn round the rest of the outline finds no ear, or if the search
    /// takes too long for the number of corners.
    bool cut(std::span<const base::vec2d> outline, base::vector<Triangle>& triangles);
    /// The corners that the last `cut` left over, in order.
    base::vector<base::u32> remainingCorners() const;

private:
    struct Search;
    void link();
    void measure(base::u32 corner);
    void queueAll();
    bool isEar(base::u32 corner, const Search& search);
    bool isBlocked(base::u32 corner, const Search& search);
    void cutOff(base::u32 corner, base::vector<Triangle>& triangles);

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
    base::u64 work_ = 0;
    PointGrid grid_;
    base::vector<base::u32> queue_;
    std::size_t queueHead_ = 0;
};

} // namespace scene
