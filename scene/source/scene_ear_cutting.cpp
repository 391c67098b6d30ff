#include "scene_ear_cutting.h"

#include <algorithm>
#include <cmath>

namespace scene {

using base::u32;
using base::u64;
using base::vec2d;

namespace {

/// What the search may spend for each corner of the outline, in points compared. Ordinary
/// outlines need some dozens; the limit keeps the time for hostile ones linear.
constexpr u64 workPerCorner = 512;
/// What it costs to look up the corner of a point that lies in an ear, elsewhere in memory.
constexpr u64 lookAtCorner = 8;
/// Part of the extent to which coordinates in double precision are good, with some to spare.
constexpr double rounding = 1e-14;

} // namespace

/// What counts as an ear. The later ones serve only where those before find nothing any more.
struct EarCutter::Search {
    double sense;  ///< 1 for corners that turn to the left, -1 to the right, 0 for flat ones
    bool touching; ///< corners on the border of an ear's triangle count as inside
};

bool EarCutter::cut(std::span<const vec2d> outline, double precision,
                    base::vector<Triangle>& triangles) {
    static constexpr Search searches[] = {
        {1, true}, {0, false}, {1, false}, {-1, true}, {-1, false}};
    points_ = outline;
    precision_ = precision;
    work_ = 0;
    queue_.clear();
    link();
    if (remaining_ < 3)
        return true;
    tree_.build(outline);
    flatTurn_ = rounding * tree_.extent() * tree_.extent();
    for (u32 i = first_, left = remaining_; left > 0; --left, i = corners_[i].next)
        measure(i);
    for (u32 i = 0; i < outline.size() && remaining_ > 3; ++i)
        if (!corners_[i].isCut && isSpike(i))
            cutOff(i, triangles);

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
    const double turned = std::as_const(corners_)[corner].turn;
    if (search.sense == 0) {
        const Corner& c = std::as_const(corners_)[corner];
        const double base = distance(points_[c.previous], points_[c.next]);
        return std::abs(turned) <= std::max(flatTurn_, precision_ * base);
    }
    return search.sense * turned > flatTurn_ && !isBlocked(corner, search);
}

bool EarCutter::isBlocked(u32 corner, const Search& search) {
    const Corner* corners = std::as_const(corners_).data();
    const u32 previous = corners[corner].previous;
    const u32 next = corners[corner].next;
    // So that the triangle turns to the left in either sense.
    const vec2d a = points_[search.sense > 0 ? previous : next];
    const vec2d b = points_[corner];
    const vec2d c = points_[search.sense > 0 ? next : previous];
    const TriangleProbe probe(a, b, c);
    const double least = search.touching ? -precision_ : rounding * tree_.extent();
    const double margin = std::min(0.0, least);

    // At the point of one of the ear's corners the outline meets itself; what counts is whether
    // it leads into the ear from there.
    const auto leadsInside = [&](const Corner& other, const vec2d& from, const vec2d& at,
                                 const vec2d& to) {
        const auto isWithin = [&](const vec2d& p) {
            return turn(from, at, p) > flatTurn_ && turn(at, to, p) > flatTurn_;
        };
        return isWithin(points_[other.previous]) || isWithin(points_[other.next]);
    };
    const auto blocks = [&](const PointTree::Item& item) {
        const vec2d& p = item.point;
        if (!probe.holds(p, margin))
            return false;
        work_ += lookAtCorner;
        const Corner& other = corners[item.index];
        if (other.isCut || search.sense * other.turn > flatTurn_)
            return false;
        if (item.index == previous || item.index == corner || item.index == next)
            return false;
        if (p == a)
            return leadsInside(other, c, a, b);
        if (p == b)
            return leadsInside(other, a, b, c);
        if (p == c)
            return leadsInside(other, b, c, a);
        return probe.holds(p, least);
    };
    return tree_.anyRun(probe, margin, [&](std::span<const PointTree::Item> run) {
        work_ += run.size();
        return std::ranges::any_of(run, blocks);
    });
}

/// True if the outline runs back along itself from the corner, or stays where it is.
bool EarCutter::isSpike(u32 corner) const {
    const Corner& c = corners_[corner];
    const vec2d at = points_[corner], p = points_[c.previous], q = points_[c.next];
    const double along = (at.x - p.x) * (q.x - at.x) + (at.y - p.y) * (q.y - at.y);
    return std::abs(c.turn) <= flatTurn_ && along <= 0;
}

/// Cuts an ear, and then the spikes that come of it: a spike beside another ear would hide that
/// the outline meets itself there.
void EarCutter::cutOff(u32 ear, base::vector<Triangle>& triangles) {
    for (;;) {
        Corner& c = corners_[ear];
        if (c.turn >= 0)
            triangles.push_back({c.previous, ear, c.next});
        else
            triangles.push_back({c.previous, c.next, ear});
        c.isCut = true;
        corners_[c.previous].next = c.next;
        corners_[c.next].previous = c.previous;
        first_ = c.next;
        --remaining_;
        measure(c.previous);
        measure(c.next);
        if (remaining_ > 3 && isSpike(c.previous)) {
            ear = c.previous;
        } else if (remaining_ > 3 && isSpike(c.next)) {
            ear = c.next;
        } else {
            queue_.push_back(c.previous);
            queue_.push_back(c.next);
            return;
        }
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
