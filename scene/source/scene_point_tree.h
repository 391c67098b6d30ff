#pragma once

#include "scene_plane.h"

/// A search tree over points in the plane, for the question which of them lie in a triangle.
namespace scene {

using Box = base::base_box<base::vec2d>;

/// A triangle that turns to the left. Depths are distances from a side, inwards.
class TriangleProbe {
public:
    TriangleProbe(const base::vec2d& a, const base::vec2d& b, const base::vec2d& c);

    /// True if the point lies at least `depth` inside each side.
    bool holds(const base::vec2d& p, double depth) const {
        return sides_[0].holds(p, depth) && sides_[1].holds(p, depth) && sides_[2].holds(p, depth);
    }
    /// True if some point of the box may be held with that depth.
    bool mayHold(const Box& box, double depth) const;

private:
    struct Side {
        base::vec2d from, way;
        double length;
        double turn(const base::vec2d& p) const {
            return way.x * (p.y - from.y) - way.y * (p.x - from.x);
        }
        bool holds(const base::vec2d& p, double depth) const { return turn(p) >= depth * length; }
    };
    std::array<Side, 3> sides_;
    Box box_;
};

/// Halves the points along the longer side of their box until few are left, so that it adapts to
/// any distribution of them.
class PointTree {
public:
    struct Item {
        base::vec2d point;
        base::u32 index; ///< among the points it was built of
    };

    void build(std::span<const base::vec2d> points);
    /// Calls `use` with runs of items, among them all that `probe` holds with `depth`, until it
    /// answers true; returns whether it did.
    template <class Use>
    bool anyRun(const TriangleProbe& probe, double depth, const Use& use) const {
        return anyRun(0, 0, items_.size(), probe, depth, use);
    }
    /// The longer side of the box round all points.
    double extent() const;

private:
    static constexpr std::size_t leafSize = 16;

    void split(std::size_t node, std::size_t begin, std::size_t end);
    template <class Use>
    bool anyRun(std::size_t node, std::size_t begin, std::size_t end, const TriangleProbe& probe,
                double depth, const Use& use) const {
        if (begin == end || !probe.mayHold(boxes_[node], depth))
            return false;
        if (end - begin <= leafSize)
            return use(std::span(items_.data() + begin, end - begin));
        const std::size_t middle = begin + (end - begin) / 2;
        return anyRun(2 * node + 1, begin, middle, probe, depth, use) ||
               anyRun(2 * node + 2, middle, end, probe, depth, use);
    }

    base::vector<Item> items_;
    base::vector<Box> boxes_; ///< of node n, whose halves are 2 n + 1 and 2 n + 2
};

} // namespace scene
