#include "polygon.h"

#include <optional>

using namespace test_support;

namespace {

/// Below this share of the squared size an area counts as none. Source coordinates are floats,
/// good for some 1e-7.
constexpr double flatness = 1e-6;

/// The search for the largest triangulation grows with the third power of the corners. Beyond this
/// number the area of a plain fan is taken.
constexpr size_t longestSearch = 400;

std::vector<Vector> withoutRepeated(const std::vector<Vector>& corners) {
    std::vector<Vector> result;
    for (const Vector& corner : corners) {
        if (result.empty() || corner != result.back()) {
            result.push_back(corner);
        }
    }
    while (result.size() > 1 && result.front() == result.back()) {
        result.pop_back();
    }
    return result;
}

/// Newell's sum: perpendicular to the polygon, as long as its area.
Vector areaVector(const std::vector<Vector>& corners) {
    Vector sum{};
    for (size_t i = 1; i + 1 < corners.size(); ++i) {
        const Vector part = cross(corners[i] - corners[0], corners[i + 1] - corners[0]);
        for (size_t axis = 0; axis < 3; ++axis) {
            sum[axis] += part[axis] / 2;
        }
    }
    return sum;
}

double fanArea(const std::vector<Vector>& corners) {
    double area = 0;
    for (size_t i = 1; i + 1 < corners.size(); ++i) {
        area += length(cross(corners[i] - corners[0], corners[i + 1] - corners[0])) / 2;
    }
    return area;
}

/// The largest area of all triangulations whose triangles, projected to `normal`, are not less than
/// `leastProjection`; none if the polygon has no such triangulation.
std::optional<double> largestTriangulation(const std::vector<Vector>& corners, const Vector& normal,
                                           double leastProjection) {
    if (corners.size() > longestSearch) {
        return fanArea(corners);
    }
    // Finds the best triangulation of each run of corners, from short to long runs.
    const size_t n = corners.size();
    std::vector<std::optional<double>> best(n * n);
    for (size_t i = 0; i + 1 < n; ++i) {
        best[i * n + i + 1] = 0;
    }
    for (size_t span = 2; span < n; ++span) {
        for (size_t first = 0; first + span < n; ++first) {
            const size_t last = first + span;
            std::optional<double>& target = best[first * n + last];
            for (size_t middle = first + 1; middle < last; ++middle) {
                const std::optional<double>& left = best[first * n + middle];
                const std::optional<double>& right = best[middle * n + last];
                const Vector part =
                    cross(corners[middle] - corners[first], corners[last] - corners[first]);
                if (left && right && dot(part, normal) / 2 >= leastProjection) {
                    target = std::max(target.value_or(0), *left + *right + length(part) / 2);
                }
            }
        }
    }
    return best[n - 1];
}

/// How far the corners spread along `normal`; 0 if that has no length.
double thicknessAlong(const std::vector<Vector>& corners, const Vector& normal) {
    double least = 0;
    double largest = 0;
    for (const Vector& corner : corners) {
        const double height = dot(corner - corners[0], normal);
        least = std::min(least, height);
        largest = std::max(largest, height);
    }
    return largest > least ? (largest - least) / length(normal) : 0;
}

} // namespace

PolygonMeasure measurePolygon(const std::vector<Vector>& allCorners) {
    const std::vector<Vector> corners = withoutRepeated(allCorners);
    PolygonMeasure result;
    result.triangles = allCorners.size() - 2;
    result.removableTriangles = std::min(result.triangles, allCorners.size() - corners.size());
    if (corners.size() < 3) {
        return result;
    }
    double size = 0;
    for (const Vector& corner : corners) {
        size = std::max(size, length(corner - corners[0]));
    }
    const Vector normal = areaVector(corners);
    result.area = length(normal);
    result.volume = dot(corners[0], normal) / 3;
    const double noArea = flatness * size * size;
    std::optional<double> largest;
    if (result.area > noArea) {
        largest = largestTriangulation(corners, normal, -noArea * result.area);
    }
    // All triangulations that face one side lie between the same two planes.
    result.volumeError = thicknessAlong(corners, normal) * result.area;
    if (largest) {
        result.leastArea = result.area;
        result.largestArea = std::max(result.area, *largest);
    } else {
        result.removableTriangles = result.triangles;
        result.largestArea = *largestTriangulation(corners, normal, -HUGE_VAL);
        result.volumeError += result.largestArea * length(corners[0]);
    }
    return result;
}
