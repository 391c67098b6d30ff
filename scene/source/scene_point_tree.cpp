#include "scene_point_tree.h"

#include <algorithm>
#include <bit>
#include <cmath>

namespace scene {

using base::vec2d;

namespace {

void include(Box& box, const vec2d& p) {
    box.min = {std::min(box.min.x, p.x), std::min(box.min.y, p.y)};
    box.max = {std::max(box.max.x, p.x), std::max(box.max.y, p.y)};
}

} // namespace

TriangleProbe::TriangleProbe(const vec2d& a, const vec2d& b, const vec2d& c) {
    const std::array<vec2d, 3> corners = {a, b, c};
    for (std::size_t i = 0; i < 3; ++i) {
        const vec2d& to = corners[(i + 1) % 3];
        Side& side = sides_[i];
        side.from = corners[i];
        side.way = {to.x - side.from.x, to.y - side.from.y};
        side.length = std::sqrt(side.way.x * side.way.x + side.way.y * side.way.y);
        include(box_, corners[i]);
    }
}

bool TriangleProbe::mayHold(const Box& box, double depth) const {
    if (box.min.x + depth > box_.max.x || box.max.x - depth < box_.min.x ||
        box.min.y + depth > box_.max.y || box.max.y - depth < box_.min.y)
        return false;
    // The corner of the box that lies farthest inside the side.
    return std::ranges::all_of(sides_, [&](const Side& side) {
        const vec2d corner = {side.way.y > 0 ? box.min.x : box.max.x,
                              side.way.x > 0 ? box.max.y : box.min.y};
        return side.holds(corner, depth);
    });
}

void PointTree::build(std::span<const vec2d> points) {
    items_.resizeUninitialized(points.size());
    Item* items = items_.data();
    for (std::size_t i = 0; i < points.size(); ++i)
        items[i] = {points[i], static_cast<base::u32>(i)};
    // A complete binary tree over leaves of half the size at least.
    const std::size_t leaves = std::bit_ceil(points.size() / leafSize + 1);
    boxes_.clear();
    boxes_.resize(2 * leaves);
    split(0, 0, points.size());
}

void PointTree::split(std::size_t node, std::size_t begin, std::size_t end) {
    Item* items = items_.data();
    Box box;
    for (std::size_t i = begin; i < end; ++i)
        include(box, items[i].point);
    boxes_[node] = box;
    if (end - begin <= leafSize)
        return;
    const std::size_t middle = begin + (end - begin) / 2;
    const bool byX = box.max.x - box.min.x > box.max.y - box.min.y;
    std::nth_element(items + begin, items + middle, items + end, [&](const Item& a, const Item& b) {
        return byX ? a.point.x < b.point.x : a.point.y < b.point.y;
    });
    split(2 * node + 1, begin, middle);
    split(2 * node + 2, middle, end);
}

double PointTree::extent() const {
    const Box& box = boxes_[0];
    return std::max(box.max.x - box.min.x, box.max.y - box.min.y);
}

} // namespace scene
