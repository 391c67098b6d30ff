#include "polygon.h"

#include <gtest/gtest.h>

#include <cmath>

using test_support::Vector;

TEST(Polygon, MeasuresWhatTriangulationsHaveInCommon) {
    struct Row {
        const char* name;
        std::vector<Vector> corners;
        size_t triangles;
        size_t removable;
        double area;
        double leastArea;
        double largestArea;
    };
    const double s = std::sqrt(0.5);
    const Row rows[] = {
        {"triangle", {{0, 0, 0}, {3, 0, 0}, {0, 4, 0}}, 1, 0, 6, 6, 6},
        {"L", {{0, 0, 0}, {2, 0, 0}, {2, 1, 0}, {1, 1, 0}, {1, 2, 0}, {0, 2, 0}}, 4, 0, 3, 3, 3},
        {"concave quad", {{0, 0, 0}, {2, 1, 0}, {4, 0, 0}, {2, 4, 0}}, 2, 0, 6, 6, 6},
        // One diagonal gives two triangles of sqrt(0.5), the other one 0.5 and sqrt(0.75).
        {"bent",
         {{0, 0, 0}, {1, 0, 0}, {1, 1, 1}, {0, 1, 0}},
         2,
         0,
         std::sqrt(1.5),
         std::sqrt(1.5),
         2 * s},
        {"corner on an edge", {{0, 0, 0}, {1, 0, 0}, {2, 0, 0}, {0, 2, 0}}, 2, 0, 2, 2, 2},
        {"on one line", {{0, 0, 0}, {1, 0, 0}, {2, 0, 0}}, 1, 1, 0, 0, 0},
        {"one corner twice", {{0, 0, 0}, {1, 0, 0}, {1, 0, 0}, {1, 1, 0}}, 2, 1, 0.5, 0.5, 0.5},
        {"crossing itself", {{0, 0, 0}, {1, 1, 0}, {1, 0, 0}, {0, 1, 0}}, 2, 2, 0, 0, 1},
    };
    for (const Row& row : rows) {
        const PolygonMeasure polygon = measurePolygon(row.corners);
        EXPECT_EQ(polygon.triangles, row.triangles) << row.name;
        EXPECT_EQ(polygon.removableTriangles, row.removable) << row.name;
        EXPECT_NEAR(polygon.area, row.area, 1e-12) << row.name;
        EXPECT_NEAR(polygon.leastArea, row.leastArea, 1e-12) << row.name;
        EXPECT_NEAR(polygon.largestArea, row.largestArea, 1e-12) << row.name;
    }
}
