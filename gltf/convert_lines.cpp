#include "gltf/exporter.h"
#include "gltf/vertex_array.h"

#include "b_log.h"
#include "scene_schema.h"

#include <algorithm>

namespace gltf {

using base::IPlugin;
using base::log;
using base::logScene;
using base::logWarning;
using base::ref;
using base::string;
using base::u32;
using base::u64;
using base::vec3f;
using base::vec4f;
using scene::lines_schema;

namespace {

/// Edges are scaled by this, so that they stand just off the surface.
constexpr float edgeScale = 1.0001f;

/// The lines of an object as single segments, each from one point to the next.
class Segments {
public:
    Segments(const scene::ILines& lines, u64 pointCount)
        : indices_(find(lines, scene::mesh_schema::n_indices)),
          starts_(find(lines, lines_schema::n_linesStart)), pointCount_(pointCount) {}

    /// Calls `use` with the first point and the number of segments of each line, in order. Returns
    /// how many lines start where no second point follows; these are left out.
    template <class Use>
    u64 forEachLine(Use use) const {
        u64 dropped = 0;
        const auto add = [&](u64 start, u64 end) {
            // A line has at least one segment, even into the next line.
            if (start + 1 < pointCount_)
                use(start, std::max(std::min(end, pointCount_), start + 2) - start - 1);
            else
                ++dropped;
        };
        if (indices_) {
            for (const u64 point : *indices_)
                add(point, point + 2);
        } else if (starts_) {
            for (std::size_t i = 0; i < starts_->size(); ++i)
                add((*starts_)[i], i + 1 < starts_->size() ? (*starts_)[i + 1] : pointCount_);
        } else if (pointCount_ > 1) {
            add(0, pointCount_);
        }
        return dropped;
    }

private:
    const base::vector<u32>* indices_; ///< first point of each segment
    const base::vector<u32>* starts_;  ///< first point of each line
    u64 pointCount_;
};

/// The points of all segments, two of three floats each; empty if there are none.
ref<GLTF::Buffer> makeSegmentPoints(const VertexArray& points, const scene::ILines& lines,
                                    float scale) {
    const Segments segments(lines, points.count());
    u64 segmentCount = 0;
    const u64 dropped = segments.forEachLine([&](u64, u64 count) { segmentCount += count; });
    if (dropped != 0)
        log().log(logScene, logWarning,
                  "gltf |{}| Found {} line segments without a second point, they are left out!",
                  lines.getName(), dropped);

    auto buffer =
        base::makeRef<GLTF::Buffer>(checkedLength(segmentCount * 2 * sizeof(vec3f), lines));
    auto* out = reinterpret_cast<vec3f*>(buffer->data);
    segments.forEachLine([&](u64 start, u64 count) {
        for (u64 point = start; point < start + count; ++point) {
            for (const u64 end : {point, point + 1}) {
                const float* p = points.element(end);
                *out++ = {p[0] * scale, p[1] * scale, p[2] * scale};
            }
        }
    });
    return buffer;
}

/// The colour in which the edges of meshes are drawn, black if the scene does not tell.
vec3f readEdgeColor(const scene::ILines& lines) {
    using scene::renderOutput_schema;
    if (!lines.pluginFactory())
        return {};
    const ref<IPlugin> settings = lines.pluginFactory()->firstOfType(renderOutput_schema::n_kind);
    if (!settings)
        return {};
    const vec3f color = read(*settings, renderOutput_schema::n_edgeColor);
    if (isFinite(&color.x, 3))
        return color;
    log().log(logScene, logWarning, "gltf |{}| The color of edges is not finite, black is taken!",
              settings->getName());
    return {};
}

} // namespace

ref<GLTF::Mesh> GLTFScenePlugin::convertLines(scene::ILines& lines, base::u32 materialIndex,
                                              bool hasAssignment) {
    VertexArray points = findVertexArray<vec3f, vec4f>(lines, lines_schema::n_points);
    if (!points)
        return nullptr;
    const bool isRepaired = makeFinite(points, lines, "points");
    const auto buffer = makeSegmentPoints(points, lines, hasAssignment ? edgeScale : 1.0f);
    if (buffer->byteLength == 0) {
        log().log(logScene, logWarning, "gltf |{}| The lines have no segments, they are left out!",
                  lines.getName());
        return nullptr;
    }

    auto gltfMesh = base::makeRef<GLTF::Mesh>();
    if (const string* name = find(lines, scene::geometry_schema::n_name))
        gltfMesh->name = *name;
    auto primitive = base::makeRef<GLTF::Primitive>();
    primitive->mode = 1;
    const auto count = static_cast<std::size_t>(buffer->byteLength) / sizeof(vec3f);
    auto position = makeAccessor(GLTF::Accessor::Type::vec3, count, makeVertexView(buffer));
    if (isRepaired)
        position->computeMinMax();
    else
        setBounds(*position, lines.getBounds());
    primitive->attributes["POSITION"] = std::move(position);
    if (hasAssignment)
        primitive->material = getEdgeMaterial(lines);
    else if (const auto* materials = find(lines, lines_schema::n_materials))
        assignMaterial(*primitive, *materials, materialIndex, nullptr);
    gltfMesh->primitives.push_back(std::move(primitive));
    ++linesIndex;
    return gltfMesh;
}

GLTF::Material* GLTFScenePlugin::getEdgeMaterial(const scene::ILines& lines) {
    if (!edgeMaterial_) {
        const vec3f color = readEdgeColor(lines);
        edgeMaterial_ = base::makeRef<GLTF::MaterialPBR>();
        edgeMaterial_->metallicRoughness->baseColorFactor = {color.x, color.y, color.z, 1};
    }
    return edgeMaterial_.get();
}

} // namespace gltf
