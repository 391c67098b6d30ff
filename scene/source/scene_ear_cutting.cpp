#include "scene_ear_cutting.h"

#include <algorithm>
#include <cmath>
#include <limits>

namespace scene {

using base::u32;
using base::u64;
using base::vec2d;

namespace {

/// Corners up to which one cell holds them all.
constexpr std::size_t smallOutline = 32;
/// Points that the search may look at for each corner of the outline. Ordinary outlines need some
/// dozens; the limit keeps the time for hostile ones linear.
constexpr u64 workPerCorner = 512;
/// Parts of the extent. Coordinates in double precision are good to some 1e-16 of it; corners
/// that lay on an edge before their coordinates were rounded to single precision are within some
/// 1e-7 of it.
constexpr double rounding = 1e-14;
constexpr double contact = 2e-7;

double distance(const vec2d& a, const vec2d& b) {
    return std::sqrt((b.x - a.x) * (b.x - a.x) + (b.y - a.y) * (b.y - a.y));
}

} // namespace

void PointGrid::build(std::span<const vec2d> points) {
    const auto [left, right] = std::ranges::minmax(points, {}, &vec2d::x);
    const auto [bottom, top] = std::ranges::minmax(points, {}, &vec2d::y);
    const double width = right.x - left.x;
    const double height = top.y - bottom.y;
    const auto count = static_cast<double>(points.size());
    min_ = {left.x, bottom.y};
    extent_ = std::max(width, height);
    // Square cells, about one for each point, and no more along one side than there are points.
    const double cell = std::max(std::sqrt(width * height / count), extent_ / count);
    const bool single = points.size() <= smallOutline || !(cell > 0);
    cellSize_ = single ? std::numeric_limits<double>::infinity() : cell;
    columnCount_ = 1 + base::saturate<u32>(width / cellSize_);
    rowCount_ = 1 + base::saturate<u32>(height / cellSize_);

    starts_.clear();
    starts_.resize(std::size_t(columnCount_) * rowCount_ + 1);
    items_.resizeUninitialized(points.size());
    const auto cellOf = [&](const vec2d& p) {
        return std::size_t(row(p.y)) * columnCount_ + column(p.x);
    };
    u32* starts = starts_.data();
    Item* items = items_.data();
    for (const vec2d& p : points)
        ++starts[cellOf(p)];
    u32 end = 0;
    for (u32& start : starts_)
        start = end += start;
    for (u32 i = static_cast<u32>(points.size()); i-- > 0;)
        items[--starts[cellOf(points[i])]] = {points[i], i};
}

u32 PointGrid::column(double x) const {
    return std::min(base::saturate<u32>((x - min_.x) / cellSize_), columnCount_ - 1);
}

u32 PointGrid::row(double y) const {
    return std::min(base::saturate<u32>((y - min_.y) / cellSize_), rowCount_ - 1);
}

namespace {

struct Interval {
    double min = std::numeric_limits<double>::max();
    double max = std::numeric_limits<double>::lowest();
    void add(double x) {
        min = std::min(min, x);
        max = std::max(max, x);
    }
};

/// The x of the part of the triangle between two heights.
Interval sliceTriangle(const std::array<vec2d, 3>& triangle, double bottom, double top) {
    Interval slice;
    for (std::size_t i = 0; i < 3; ++i) {
        const vec2d& p = triangle[i];
        const vec2d& q = triangle[(i + 1) % 3];
        if (p.y >= bottom && p.y <= top)
            slice.add(p.x);
        for (const double y : {bottom, top})
            if ((p.y < y) != (q.y < y))
                slice.add(p.x + (q.x - p.x) * ((y - p.y) / (q.y - p.y)));
    }
    return slice;
}

} // namespace

/// Row by row: long thin triangles at a slant touch few cells of each.
template <class Use>
bool PointGrid::anyRun(const std::array<vec2d, 3>& triangle, double margin, Use use) const {
    const auto [lowest, highest] = std::ranges::minmax(triangle, {}, &vec2d::y);
    const u32 lastRow = row(highest.y + margin);
    for (u32 y = row(lowest.y - margin); y <= lastRow; ++y) {
        const double bottom = min_.y + y * cellSize_;
        const Interval slice = rowCount_ == 1 ? sliceTriangle(triangle, lowest.y, highest.y)
                                              : sliceTriangle(triangle, bottom - margin,
                                                              bottom + cellSize_ + margin);
        const std::size_t cells = std::size_t(y) * columnCount_;
        const u32 begin = starts_[cells + column(slice.min - margin)];
        const u32 end = starts_[cells + column(slice.max + margin) + 1];
        if (begin < end && use(std::span(items_.data() + begin, end - begin)))
            return true;
    }
    return false;
}

/// What counts as an ear. The later ones serve only where those before find nothing any more.
struct EarCutter::Search {
    double sense;  ///< 1 for corners that turn to the left, -1 to the right, 0 for flat ones
    bool touching; ///< corners on the border of an ear's triangle count as inside
};

bool EarCutter::cut(std::span<const vec2d> outline, base::vector<Triangle>& triangles) {
    static constexpr Search searches[] = {{1, true}, {1, false}, {0, false}, {-1, true}, {-1, false}};
    points_ = outline;
    work_ = 0;
    link();
    if (remaining_ < 3)
        return true;
    grid_.build(outline);
    flatTurn_ = rounding * grid_.extent() * grid_.extent();
    for (u32 i = first_, left = remaining_; left > 0; --left, i = corners_[i].next)
        measure(i);

    const Search* search = std::begin(searches);
    bool found = false;
    queueAll();
    while (remaining_ > 3) {
        if (queueHead_ == queue_.size()) {
            search = found ? std::begin(searches) : search + 1;
            if (search == std::end(searches))
                return false;
            found = false;
            queueAll();
        }
        const u32 corner = std::as_const(queue_)[queueHead_++];
        if (!std::as_const(corners_)[corner].isCut && isEar(corner, *search)) {
            cutOff(corner, triangles);
            found = true;
        }
        if (work_ > workPerCorner * outline.size())
            return false;
    }
    cutOff(first_, triangles);
    remaining_ = 0;
    return true;
}

/// Links the corners to a ring without those that repeat the point before.
void EarCutter::link() {
    corners_.resizeUninitialized(points_.size());
    first_ = 0;
    remaining_ = 0;
    u32 last = 0;
    for (u32 i = 0; i < points_.size(); ++i) {
        corners_[i].isCut = remaining_ > 0 && points_[i] == points_[last];
        if (corners_[i].isCut)
            continue;
        corners_[i].previous = last;
        corners_[last].next = i;
        last = i;
        ++remaining_;
    }
    if (remaining_ > 1 && points_[last] == points_[first_]) {
        corners_[last].isCut = true;
        last = corners_[last].previous;
        --remaining_;
    }
    corners_[last].next = first_;
    corners_[first_].previous = last;
}

void EarCutter::measure(u32 corner) {
    Corner& c = corners_[corner];
    c.turn = turn(points_[c.previous], points_[corner], points_[c.next]);
}

void EarCutter::queueAll() {
    queue_.clear();
    queueHead_ = 0;
    for (u32 i = first_, left = remaining_; left > 0; --left, i = corners_[i].next)
        queue_.push_back(i);
    work_ += remaining_;
}

bool EarCutter::isEar(u32 corner, const Search& search) {
    const double turned = corners_[corner].turn;
    if (search.sense == 0)
        return std::abs(turned) <= flatTurn_;
    return search.sense * turned > flatTurn_ && !isBlocked(corner, search);
}

bool EarCutter::isBlocked(u32 corner, const Search& search) {
    const Corner* corners = std::as_const(corners_).data();
    const u32 previous = corners[corner].previous;
    const u32 next = corners[corner].next;
    const vec2d a = points_[previous], b = points_[corner], c = points_[next];
    const auto side = [&](const vec2d& from, const vec2d& to, const vec2d& p) {
        return search.sense * turn(from, to, p);
    };
    // A turn is the distance from the side times the side's length.
    const double least = (search.touching ? -contact : rounding) * grid_.extent();
    const double margin = std::max(0.0, -least);
    const double ab = distance(a, b), bc = distance(b, c), ca = distance(c, a);
    const auto isInside = [&](const vec2d& p, double depth) {
        return side(a, b, p) >= depth * ab && side(b, c, p) >= depth * bc &&
               side(c, a, p) >= depth * ca;
    };
    // At the point of one of the ear's corners the outline meets itself; what counts is whether
    // it leads into the ear from there.
    const auto leadsInside = [&](const Corner& other, const vec2d& from, const vec2d& at,
                                 const vec2d& to) {
        const auto isWithin = [&](const vec2d& p) {
            return side(from, at, p) > flatTurn_ && side(at, to, p) > flatTurn_;
        };
        return isWithin(points_[other.previous]) || isWithin(points_[other.next]);
    };
    const auto blocks = [&](const PointGrid::Item& item) {
        const vec2d& p = item.point;
        if (!isInside(p, -margin))
            return false;
        const Corner& other = corners[item.corner];
        if (other.isCut || search.sense * other.turn > flatTurn_)
            return false;
        if (item.corner == previous || item.corner == corner || item.corner == next)
            return false;
        if (p == a)
            return leadsInside(other, c, a, b);
        if (p == b)
            return leadsInside(other, a, b, c);
        if (p == c)
            return leadsInside(other, b, c, a);
        return isInside(p, least);
    };
    return grid_.anyRun({a, b, c}, margin, [&](std::span<const PointGrid::Item> run) {
        work_ += run.size() + 1;
        return std::ranges::any_of(run, blocks);
    });
}

void EarCutter::cutOff(u32 corner, base::vector<Triangle>& triangles) {
    Corner& c = corners_[corner];
    if (c.turn >= 0)
        triangles.push_back({c.previous, corner, c.next});
    else
        triangles.push_back({c.previous, c.next, corner});
    c.isCut = true;
    corners_[c.previous].next = c.next;
    corners_[c.next].previous = c.previous;
    first_ = c.next;
    --remaining_;
    for (const u32 neighbour : {c.previous, c.next}) {
        measure(neighbour);
        queue_.push_back(neighbour);
    }
}

base::vector<u32> EarCutter::remainingCorners() const {
    base::vector<u32> corners;
    u32 start = first_;
    for (u32 i = first_, left = remaining_; left > 0; --left, i = corners_[i].next)
        start = std::min(start, i);
    for (u32 i = start, left = remaining_; left > 0; --left, i = corners_[i].next)
        corners.push_back(i);
    return corners;
}

} // namespace scene
