#include "scene_mesh_triangulate.h"

#include "mesh_builder.h"

#include "log_capture.h"
#include "temp_folder.h"

#include <cmath>
#include <cstdlib>
#include <fstream>
#include <functional>
#include <limits>
#include <numbers>
#include <random>

namespace {

using namespace scene;
using namespace test_support;
using namespace base;

constexpr double pi = std::numbers::pi;
constexpr double nan = std::numeric_limits<double>::quiet_NaN();
using Outline = std::vector<vec2d>;
using Indices = std::vector<u32>;

Indices cut(const vector<vec3f>& positions, const Indices& corners) {
    vector<u32> output;
    PolygonTriangulator triangulator(positions, "box");
    triangulator.triangulatePolygon(corners.data(), u32(corners.size()), output);
    return listOf(&output);
}

/// Cuts the outline in the plane z = 0; the indices are those of the outline.
Indices cut(const Outline& outline) {
    vector<vec3f> positions;
    Indices corners;
    for (const vec2d& p : outline) {
        corners.push_back(u32(positions.size()));
        positions.push_back({float(p.x), float(p.y), 0});
    }
    return cut(positions, corners);
}

double turn(const vec2d& a, const vec2d& b, const vec2d& c) {
    return (b.x - a.x) * (c.y - a.y) - (b.y - a.y) * (c.x - a.x);
}

double areaOf(const Outline& outline) {
    double sum = 0;
    for (std::size_t i = 0; i < outline.size(); ++i) {
        const vec2d &p = outline[i], &q = outline[(i + 1) % outline.size()];
        sum += p.x * q.y - p.y * q.x;
    }
    return sum / 2;
}

/// Times that the outline goes round the point to the left.
int windingAt(const Outline& outline, const vec2d& point) {
    int winding = 0;
    for (std::size_t i = 0; i < outline.size(); ++i) {
        const vec2d &p = outline[i], &q = outline[(i + 1) % outline.size()];
        if (p.y <= point.y && q.y > point.y && turn(p, q, point) > 0)
            ++winding;
        else if (p.y > point.y && q.y <= point.y && turn(p, q, point) < 0)
            --winding;
    }
    return winding;
}

// Outlines that turn to the left, of up to 200 corners.
class OutlineMaker {
public:
    explicit OutlineMaker(unsigned seed) : random_(seed) {}
    int number(int from, int to) { return from + int(random_() % unsigned(to - from + 1)); }
    double real(double from, double to) {
        return from + (to - from) * (double(random_()) / 4294967296.0);
    }
    Outline star(int count) {
        Outline outline;
        for (int i = 0; i < count; ++i) {
            const double radius = real(0.6, 3), angle = 2 * pi * i / count;
            outline.push_back({radius * std::cos(angle), radius * std::sin(angle)});
        }
        return outline;
    }
    Outline comb(int teeth) {
        Outline outline = {{0, -4}, {2.0 * teeth, -4}};
        for (int i = teeth - 1; i >= 0; --i) {
            const double x = 2 * i;
            outline.insert(outline.end(), {{x + 2, -3}, {x + 1, -3}, {x + 1, 0}, {x, 0}});
        }
        return outline;
    }
    Outline spiral(int count) {
        Outline out, in;
        for (int i = 0; i < count / 2; ++i) {
            const double angle = 0.4 * i, radius = 1 + 0.1 * i;
            out.push_back({radius * std::cos(angle), radius * std::sin(angle)});
            in.push_back({(radius - 0.6) * std::cos(angle), (radius - 0.6) * std::sin(angle)});
        }
        out.insert(out.end(), in.rbegin(), in.rend());
        return out;
    }
    /// More corners on the edges.
    Outline withRuns(const Outline& outline, int most) {
        Outline result;
        for (std::size_t i = 0; i < outline.size(); ++i) {
            const vec2d p = outline[i], q = outline[(i + 1) % outline.size()];
            const int parts = number(1, most);
            for (int k = 0; k < parts; ++k)
                result.push_back({p.x + (q.x - p.x) * k / parts, p.y + (q.y - p.y) * k / parts});
        }
        return result;
    }
    Outline withRepeats(const Outline& outline) {
        Outline result;
        for (const vec2d& p : outline)
            result.insert(result.end(), std::size_t(number(1, 3)), p);
        result.push_back(outline[0]);
        return result;
    }
    /// A plate with holes, each reached along a bridge that is walked in both directions.
    Outline withHoles(int holes) {
        Outline outline = {{0, 0}};
        for (int h = 0; h < holes; ++h) {
            const double x = 2 + 3 * h;
            outline.push_back({x, 0});
            for (int i = 0; i <= 8; ++i)
                outline.push_back({x - std::sin(pi / 4 * i), 2 - std::cos(pi / 4 * i)});
            outline.push_back({x, 0});
        }
        outline.insert(outline.end(), {{3.0 * holes + 1, 0}, {3.0 * holes + 1, 4}, {0, 4}});
        return outline;
    }

private:
    std::mt19937 random_;
};

struct Plane {
    double u[3], v[3], origin[3];
};
const Plane planes[] = {{{1, 0, 0}, {0, 1, 0}, {0, 0, 0}},
                        {{0, 0.6, 0.8}, {1, 0, 0}, {0, 0, 0}},
                        {{0.36, 0.48, -0.8}, {0.8, -0.6, 0}, {30, -20, 10}}};

vector<vec3f> embed(const Outline& outline, const Plane& plane) {
    vector<vec3f> positions;
    for (const vec2d& p : outline) {
        const auto at = [&](int k) {
            return float(plane.origin[k] + p.x * plane.u[k] + p.y * plane.v[k]);
        };
        positions.push_back({at(0), at(1), at(2)});
    }
    return positions;
}

// Whatever the shape, the triangles make up the polygon: their areas sum up to its own, all have
// its winding, and none lies outside.
TEST(PolygonTriangulation, KeepsTheAreaOfSimplePolygons) {
    struct Kind {
        const char* name;
        std::function<Outline(OutlineMaker&)> make;
        bool touches;
    };
    const Kind kinds[] = {
        {"star", [](OutlineMaker& m) { return m.star(m.number(5, 200)); }, false},
        {"comb", [](OutlineMaker& m) { return m.comb(m.number(2, 49)); }, false},
        {"spiral", [](OutlineMaker& m) { return m.spiral(m.number(8, 200)); }, false},
        {"comb runs", [](OutlineMaker& m) { return m.withRuns(m.comb(m.number(1, 12)), 4); },
         false},
        {"repeats", [](OutlineMaker& m) { return m.withRepeats(m.star(m.number(5, 60))); }, true},
        {"hole runs", [](OutlineMaker& m) { return m.withRuns(m.withHoles(m.number(1, 4)), 3); },
         true},
    };
    OutlineMaker maker(19);
    for (const Kind& kind : kinds) {
        for (int round = 0; round < 60; ++round) {
            SCOPED_TRACE(string(kind.name) + " " + std::to_string(round));
            Outline outline = kind.make(maker);
            const double sense = round % 2 == 0 ? 1 : -1;
            if (sense < 0)
                std::ranges::reverse(outline);
            Indices corners(outline.size());
            for (u32 i = 0; i < corners.size(); ++i)
                corners[i] = i;
            LogCapture log;
            const Indices triangles = cut(embed(outline, planes[round % 3]), corners);
            ASSERT_EQ(triangles.size() % 3, 0u);
            double sum = 0;
            for (std::size_t t = 0; t < triangles.size(); t += 3) {
                const vec2d &a = outline[triangles[t]], &b = outline[triangles[t + 1]],
                            &c = outline[triangles[t + 2]];
                const double area = sense * turn(a, b, c) / 2;
                sum += area;
                // Single precision may bend a run of collinear corners by some 1e-5.
                ASSERT_GT(area, -1e-4);
                const vec2d middle = {(a.x + b.x + c.x) / 3, (a.y + b.y + c.y) / 3};
                ASSERT_TRUE(area <= 1e-3 || windingAt(outline, middle) == sense);
            }
            const double expected = sense * areaOf(outline);
            ASSERT_NEAR(sum, expected, 1e-4 * expected);
            for (const LogCapture::Entry& entry : log.entries())
                ASSERT_TRUE(entry.level == 5 || kind.touches) << entry.text;
        }
    }
}

TEST(PolygonTriangulation, CoversPolygonsThatCrossThemselves) {
    OutlineMaker maker(5);
    LogCapture log;
    for (int round = 0; round < 200; ++round) {
        SCOPED_TRACE(round);
        Outline outline;
        const int count = maker.number(5, 60);
        for (int i = 0; i < count; ++i)
            outline.push_back({maker.real(0, 5), maker.real(0, 5)});
        const Indices triangles = cut(outline);
        for (int sample = 0; sample < 100; ++sample) {
            const vec2d point = {maker.real(0, 5), maker.real(0, 5)};
            bool covered = false;
            for (std::size_t t = 0; t + 2 < triangles.size() && !covered; t += 3)
                covered = windingAt({outline[triangles[t]], outline[triangles[t + 1]],
                                     outline[triangles[t + 2]]},
                                    point) != 0;
            ASSERT_TRUE(covered || windingAt(outline, point) == 0);
        }
        const double sense = areaOf(outline) > 0 ? 1 : -1;
        for (std::size_t t = 0; t + 2 < triangles.size(); t += 3)
            ASSERT_GT(sense * turn(outline[triangles[t]], outline[triangles[t + 1]],
                                   outline[triangles[t + 2]]),
                      0);
    }
}

TEST(PolygonTriangulation, Quads) {
    struct Row {
        Outline quad;
        Indices triangles;
    };
    const Indices from0 = {0, 1, 2, 0, 2, 3}, from1 = {0, 1, 3, 1, 2, 3};
    const Row rows[] = {
        {{{0, 0}, {1, 0}, {1, 1}, {0, 1}}, from0},  // equal diagonals
        {{{0, 0}, {2, -1}, {4, 0}, {2, 1}}, from1}, // the shorter one
        {{{0, -1}, {2, 0}, {0, 1}, {-2, 0}}, from0},
        {{{1, 0}, {0, -1}, {10, 0}, {0, 1}}, from0}, // reflex at 0, though that is the longer one
        {{{0, 1}, {1, 0}, {0, -1}, {10, 0}}, from1},
        {{{10, 0}, {0, 1}, {1, 0}, {0, -1}}, from0},
        {{{0, -1}, {10, 0}, {0, 1}, {1, 0}}, from1},
        {{{0, 1}, {10, 0}, {0, -1}, {1, 0}}, from1},            // the other way round
        {{{0, 0}, {1e-9, 0}, {1e-9, 3e-8}, {0, 1e-9}}, from0}}; // lengths of nothing are equal
    for (const Row& row : rows)
        EXPECT_EQ(cut(row.quad), row.triangles) << row.quad[1].x << ' ' << row.quad[1].y;
}

// What is Delaunay about it: the diagonals of a flat hexagon are the short ones.
TEST(PolygonTriangulation, PrefersShortDiagonals) {
    const Indices triangles = cut(Outline{{0, 0}, {10, -0.5}, {20, 0}, {20, 1}, {10, 1.5}, {0, 1}});
    bool found = false;
    for (std::size_t t = 0; t < triangles.size(); t += 3)
        for (std::size_t k = 0; k < 3; ++k)
            found |= triangles[t + k] == 1 && triangles[t + (k + 1) % 3] == 4;
    EXPECT_TRUE(found);
    EXPECT_EQ(triangles.size(), 12u);
}

TEST(PolygonTriangulation, Messages) {
    struct Row {
        const char* what;
        Outline outline;
        std::size_t triangles;
        string messages;
    };
    const string touches = "3 triangulate |box| Error detected - 'the outline touches itself', "
                           "falling back to earcut!\n";
    const string crosses =
        "3 triangulate |box| Polygon self intersection detected, falling back to earcut!\n";
    const string simple =
        "3 triangulate |box| Error detected - falling back to simple triangulation!\n";
    const string errors = "3 triangulate |box| Found errors, may result in missing triangles!\n";
    const string noNormal =
        "2 triangulate| box| Can't calculate the polygon normal for plane projection, skipping!\n";
    const string zeroArea = "5 triangulate box| Dropping triangle with zero area!\n";
    const Row rows[] = {
        {"two corners", {{0, 0}, {1, 0}}, 0, {}},
        {"pentagram", {{0, 3}, {-2, -3}, {3, 1}, {-3, 1}, {2, -3}}, 3, crosses},
        {"repeated point", {{0, 0}, {2, 0}, {2, 2}, {2, 2}, {0, 2}}, 2, touches},
        {"line", {{0, 0}, {1, 1}, {2, 2}, {3, 3}, {4, 4}}, 0, noNormal},
        {"rounded line", {{0, 0}, {.1, .3}, {.2, .6}, {.3, .9}, {.7, 2.1}}, 0, noNormal},
        {"point", {{1, 1}, {1, 1}, {1, 1}, {1, 1}, {1, 1}}, 0, noNormal},
        {"not a number", {{0, 0}, {1, 0}, {nan, 1}, {1, 2}, {0, 2}}, 0, noNormal},
        {"infinite", {{0, 0}, {1, 0}, {1e300, 1}, {1, 2}, {0, 2}}, 0, noNormal},
        {"sliver of 1e-9", {{0, 0}, {1e-9, 0}, {2, 0}, {2, 2}, {0, 2}}, 2, zeroArea},
        {"no ear left",
         {{4, 2}, {3, 2}, {0, 1}, {1, 4}, {3, 2}, {1, 1}, {4, 3}, {0, 1}},
         6,
         crosses + simple},
        {"nothing left to cut",
         {{4, 3}, {4, 1}, {3, 0}, {4, 3}, {0, 3}, {3, 0}, {4, 1}, {2, 2}},
         4,
         crosses + simple + errors},
        // A corner on an edge is no crossing. The library would search for ever in such outlines.
        {"crossing in a corner",
         {{2, 1}, {3, 3}, {4, 4}, {1, 4}, {1, 2}, {3, 0}, {4, 3}, {1, 3}, {0, 0}},
         6,
         touches + zeroArea}};
    for (const Row& row : rows) {
        LogCapture log;
        EXPECT_EQ(cut(row.outline).size() / 3, row.triangles) << row.what;
        EXPECT_EQ(linesOf(log), row.messages) << row.what;
    }
}

TEST(PolygonTriangulation, DropsPolygonsWithCornersPastTheEnd) {
    vector<vec3f> positions(4);
    for (const Indices& corners : {Indices{0, 1, 2, 4}, Indices{0, 1, 2, 4294967295, 3}}) {
        LogCapture log;
        EXPECT_TRUE(cut(positions, corners).empty());
        const string start = "2 triangulate |box| Dropping invalid quad [         0,         1,";
        EXPECT_EQ(linesOf(log), start + (corners.size() == 4 ? "         2,         4]!\n"
                                                             : "         2,4294967295]!\n"));
    }
    EXPECT_EQ(cut(positions, {7, 8, 9}), (Indices{7, 8, 9})); // triangles are not looked at
}

// Too large for what takes quadratic time; simple ones are cut up all the same.
TEST(PolygonTriangulation, LargePolygons) {
    OutlineMaker maker(3);
    for (const Outline& outline : {maker.star(4097), maker.comb(4000), maker.spiral(12000)}) {
        LogCapture log;
        const Indices triangles = cut(outline);
        double sum = 0;
        for (std::size_t t = 0; t < triangles.size(); t += 3)
            sum +=
                turn(outline[triangles[t]], outline[triangles[t + 1]], outline[triangles[t + 2]]);
        EXPECT_NEAR(sum / 2, areaOf(outline), 1e-5 * areaOf(outline));
        EXPECT_TRUE(log.has(3, "triangulate |box| Error detected - 'more than 4096 corners', "
                               "falling back to earcut!"));
    }
    // One that can't be cut in time ends with the simple triangulation.
    Outline hostile;
    for (int i = 0; i < 30000; ++i)
        hostile.push_back({double(i % 7), double(i % 3)});
    LogCapture log;
    EXPECT_FALSE(cut(hostile).empty());
    EXPECT_TRUE(log.has(3, "triangulate |box| Error detected - falling back to simple "
                           "triangulation!"));
}

/// Cuts a pentagon and ends the process: with 0 if the ears served and the message holds what the
/// loader said of the file.
void cutWithBrokenLibrary() {
    LogCapture log;
    const Indices triangles = cut(Outline{{0, 0}, {2, 0}, {3, 1}, {2, 2}, {0, 2}});
    const string start = "triangulate |box| Error detected - '/";
    const string end = "/libgeos_c.so.1: file too short', falling back to earcut!";
    const bool good = triangles.size() == 9 && log.entries().size() == 1 &&
                      log.entries()[0].level == 3 && log.entries()[0].text.starts_with(start) &&
                      log.entries()[0].text.ends_with(end);
    std::exit(good ? 0 : 1);
}

TEST(PolygonTriangulationDeathTest, WorksWithoutTheLibrary) {
    GTEST_FLAG_SET(death_test_style, "threadsafe"); // in a process that starts anew
    static const TempFolder folder;                 // that of the new process goes with it
    std::ofstream(folder / "libgeos_c.so.1");
    const char* before = getenv("LD_LIBRARY_PATH");
    const string path = before ? before : "";
    setenv("LD_LIBRARY_PATH", (folder.path() + ":" + path).c_str(), 1);
    EXPECT_EXIT(cutWithBrokenLibrary(), testing::ExitedWithCode(0), "");
    setenv("LD_LIBRARY_PATH", path.c_str(), 1);
}

class Triangulation : public MeshTest {
protected:
    /// A row of unit squares: corner (x, y) is position 2 x + y.
    void setSquares(int count) {
        auto& positions = write(mesh_, mesh_schema::n_positions);
        for (int x = 0; x <= count; ++x)
            for (int y = 0; y < 2; ++y)
                positions.push_back({float(x), float(y), 0});
    }
    Indices triangles() const { return listOf(find(mesh_, mesh_schema::n_triIndices)); }
    static void expectRange(const AttribMap& primitive, u32 start, u32 count) {
        const u32* foundStart = find(primitive, meshPrimitive_schema::n_triIndexStart);
        const u32* foundCount = find(primitive, meshPrimitive_schema::n_triIndexCount);
        ASSERT_TRUE(foundStart && foundCount);
        EXPECT_EQ(*foundStart, start);
        EXPECT_EQ(*foundCount, count);
    }
};

TEST_F(Triangulation, NothingToDo) {
    LogCapture log;
    EXPECT_TRUE(triangulate(mesh_, false, true));
    AttribMap& quads = addPrimitive({4});
    EXPECT_TRUE(triangulate(mesh_, false, true)); // no positions
    setSquares(1);
    write(mesh_, mesh_schema::n_indices) = {0, 2, 3, 1};
    EXPECT_TRUE(triangulate(mesh_, true, true)); // quads may stay
    write(quads, meshPrimitive_schema::n_topology) = {5};
    EXPECT_TRUE(triangulate(mesh_, false, true)); // a fan
    EXPECT_EQ(find(mesh_, mesh_schema::n_triIndices), nullptr);
    write(quads, meshPrimitive_schema::n_topology) = {0};
    write(mesh_, mesh_schema::n_triIndices) = {3, 1, 0};
    EXPECT_TRUE(triangulate(mesh_, false, true)); // there already
    EXPECT_EQ(triangles(), (Indices{3, 1, 0}));
    mesh_.removeAttribute(mesh_schema::n_triIndices);
    EXPECT_TRUE(triangulate(mesh_, false, true));
    EXPECT_EQ(triangles(), (Indices{0, 2, 3, 0, 3, 1}));
    EXPECT_TRUE(log.entries().empty());
}

// One primitive that needs work moves all of them to the triangle indices.
TEST_F(Triangulation, CarriesTheOtherPrimitivesOver) {
    setSquares(3);
    write(mesh_, mesh_schema::n_indices) = {0, 2, 3, 1, 0, 1, 2, 0, 2, 1, 3, 5, 4, 2, 3, 5, 4, 6};
    AttribMap& quads = addPrimitive({4});
    setRange(quads, 0, 4);
    AttribMap& strip = add(mesh_schema::n_primitives);
    write(strip, meshPrimitive_schema::n_topology) = {4};
    setRange(strip, 4, 3);
    write(mesh_, mesh_schema::n_primitives).append(nullptr);
    AttribMap& lines = addPrimitive({2});
    setRange(lines, 7, 2);
    AttribMap& lineList = addPrimitive({2, 2});
    setRange(lineList, 0, 4);
    AttribMap& points = addPrimitive({1});
    setRange(points, 2, 1);
    AttribMap& mixed = addPrimitive({2, 3, 4});
    setRange(mixed, 9, 9);
    LogCapture log;
    EXPECT_TRUE(triangulate(mesh_, false, true));
    EXPECT_EQ(triangles(), (Indices{0, 2, 3, 0, 3, 1, // quads
                                    0, 1, 2,          // strip
                                    0, 2,             // lines
                                    0, 2, 3, 1,       // list of lines
                                    3,                // points
                                    5, 4, 2,          // the triangle of the mixed ones
                                    3, 5, 4, 3, 4, 6}));
    expectRange(quads, 0, 6);
    expectRange(strip, 6, 3);
    expectRange(lines, 9, 2);
    expectRange(lineList, 11, 4);
    expectRange(points, 15, 1);
    expectRange(mixed, 16, 9);
    EXPECT_EQ(getPrimitiveType(mesh_, 0, true), primitiveTriangles);
    EXPECT_EQ(getPrimitiveType(mesh_, 6, true), primitiveTriangles);
    EXPECT_TRUE(log.entries().empty());
}

// Readers take a list of sizes for polygons, so triangles alone need the step as well.
TEST_F(Triangulation, ListsOfTriangles) {
    setSquares(1);
    addPrimitive({3, 3});
    EXPECT_TRUE(triangulate(mesh_, false, true) && triangles().empty() == false);
    write(mesh_, mesh_schema::n_triIndices).clear();
    write(mesh_, mesh_schema::n_indices) = {0, 2, 3, 0, 3, 1};
    EXPECT_TRUE(triangulate(mesh_, true, true));
    EXPECT_EQ(triangles(), (Indices{0, 2, 3, 0, 3, 1}));
}

TEST_F(Triangulation, FaceIndices) {
    setSquares(2);
    AttribMap& quads = addPrimitive({4});
    setRange(quads, 0, 4);
    // None: the positions in order.
    EXPECT_TRUE(triangulate(mesh_, false, true));
    EXPECT_EQ(triangles(), (Indices{0, 1, 2, 0, 2, 3}));
    // Those of the positions, if the mesh could not be converted.
    mesh_.removeAttribute(mesh_schema::n_triIndices);
    write(mesh_, mesh_schema::n_positionIndices) = {2, 4, 5, 3};
    EXPECT_TRUE(triangulate(mesh_, false, true));
    EXPECT_EQ(triangles(), (Indices{2, 4, 5, 2, 5, 3}));
    mesh_.removeAttribute(mesh_schema::n_triIndices);
    write(mesh_, mesh_schema::n_indices) = {0, 2, 3};
    LogCapture log;
    EXPECT_FALSE(triangulate(mesh_, false, true));
    EXPECT_TRUE(log.has(2, "triangulate |box| Inconsistent position (3) and global index count "
                           "(4)."));
    EXPECT_EQ(find(mesh_, mesh_schema::n_triIndices), nullptr);
}

TEST_F(Triangulation, FaultyCounts) {
    setSquares(2);
    const vector<u32> indices = {0, 2, 3, 1, 2, 4, 5};
    struct Row {
        vector<u16> vcounts;
        u32 start, count;
        Indices triangles;
        string message;
    };
    const Row rows[] = {
        {{4}, 0, 7, {0, 2, 3, 0, 3, 1}, "Invalid face vertex count 4!"},
        {{0}, 0, 7, {}, "Invalid face vertex count 0!"},
        {{4, 4}, 0, 7, {0, 2, 3, 0, 3, 1}, "Invalid face vertex counts. Expected 7, got 8!"},
        {{65535, 65535}, 0, 7, {}, "Invalid face vertex counts. Expected 7, got 131070!"},
        {{0, 4, 1}, 0, 7, {0, 2, 3, 0, 3, 1}, "Invalid face vertex counts. Expected 7, got 5!"},
        {{3}, 4, 4, {2, 4, 5}, "Index offset/count out of bounds 4-4 out of 7!"},
        {{3}, ~0u, ~0u, {}, "Index offset/count out of bounds 4294967295-4294967295 out of 7!"}};
    for (const Row& row : rows) {
        SCOPED_TRACE(row.message);
        mesh_.removeAttribute(mesh_schema::n_primitives);
        mesh_.removeAttribute(mesh_schema::n_triIndices);
        write(mesh_, mesh_schema::n_indices) = indices;
        AttribMap& primitive = add(mesh_schema::n_primitives);
        write(primitive, meshPrimitive_schema::n_vcounts) = row.vcounts;
        setRange(primitive, row.start, row.count);
        AttribMap& other = addPrimitive({5}); // needs work
        setRange(other, 0, 0);
        LogCapture log;
        EXPECT_TRUE(triangulate(mesh_, false, true));
        EXPECT_EQ(triangles(), row.triangles);
        expectRange(primitive, 0, u32(row.triangles.size()));
        EXPECT_EQ(linesOf(log), "2 validate |box| " + row.message + "\n");
    }
}

// Each primitive without a range takes all indices; together they would fill the memory.
TEST_F(Triangulation, RefusesToMultiplyIndices) {
    setSquares(1);
    write(mesh_, mesh_schema::n_indices).resize(1 << 20);
    addPrimitive({5});
    for (int i = 0; i < 512; ++i)
        addPrimitive({3});
    LogCapture log;
    EXPECT_FALSE(triangulate(mesh_, false, true));
    EXPECT_EQ(log.entries().size(), 1u);
    EXPECT_EQ(find(mesh_, mesh_schema::n_triIndices), nullptr);
}

} // namespace
