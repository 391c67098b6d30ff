// model_stats FILE: what a model file holds before any export, as JSON. Exit code 2 if it can't be
// read. Reads with the assimp library and leaves polygons as they are.

#include "model_world.h"
#include "polygon.h"
#include "stats_json.h"

#include <assimp/Importer.hpp>

#include <algorithm>
#include <cstdio>

using namespace test_support;

namespace {

/// What polygons leave open: see `PolygonMeasure`.
struct Allowances {
    size_t degenerateFaces = 0;
    size_t removableTriangles = 0;
    double leastArea = 0;
    double largestArea = 0;
    double volumeError = 0;
    /// Around the faces that can't be missing.
    Box innerBounds;
};

void addFace(Totals& totals, Allowances& allowances, const std::vector<Vector>& corners) {
    if (corners.size() < 3) {
        totals.points += corners.size() == 1 ? 1 : 0;
        totals.lines += corners.size() == 2 ? 1 : 0;
        return;
    }
    const PolygonMeasure polygon = measurePolygon(corners);
    totals.triangles += polygon.triangles;
    totals.area += polygon.area;
    totals.volume += polygon.volume;
    allowances.degenerateFaces += polygon.removableTriangles > 0 ? 1 : 0;
    allowances.removableTriangles += polygon.removableTriangles;
    allowances.leastArea += polygon.leastArea;
    allowances.largestArea += polygon.largestArea;
    allowances.volumeError += polygon.volumeError;
    for (const Vector& corner : corners) {
        totals.triangleBounds.add(corner);
        if (polygon.removableTriangles == 0) {
            allowances.innerBounds.add(corner);
        }
    }
}

void addMesh(Totals& totals, Allowances& allowances, const aiMesh& mesh, const Matrix& matrix) {
    for (unsigned f = 0; f < mesh.mNumFaces; ++f) {
        std::vector<Vector> corners;
        for (unsigned i = 0; i < mesh.mFaces[f].mNumIndices; ++i) {
            const aiVector3D& p = mesh.mVertices[mesh.mFaces[f].mIndices[i]];
            corners.push_back(transformPoint(matrix, {p.x, p.y, p.z}));
        }
        addFace(totals, allowances, corners);
    }
}

struct Model {
    Totals stored;
    Totals drawn;
    Allowances storedAllowances;
    Allowances drawnAllowances;
};

void addNode(Model& model, std::vector<bool>& met, const aiScene& scene, const aiNode& node,
             const Matrix& worldFromParent) {
    const Matrix worldFromNode = worldFromParent * toMatrix(node.mTransformation);
    for (unsigned i = 0; i < node.mNumMeshes; ++i) {
        const unsigned index = node.mMeshes[i];
        const aiMesh& mesh = *scene.mMeshes[index];
        addMesh(model.drawn, model.drawnAllowances, mesh, worldFromNode);
        if (!met[index]) {
            met[index] = true;
            addMesh(model.stored, model.storedAllowances, mesh, toMatrix(aiMatrix4x4()));
        }
    }
    for (unsigned i = 0; i < node.mNumChildren; ++i) {
        addNode(model, met, scene, *node.mChildren[i], worldFromNode);
    }
}

void print(const Model& model) {
    rapidjson::StringBuffer buffer;
    StatsWriter writer(buffer);
    beginStats(writer, model.stored, model.drawn);
    writeCount(writer, "storedRemovableTriangles", model.storedAllowances.removableTriangles);
    writeCount(writer, "removableTriangles", model.drawnAllowances.removableTriangles);
    writeCount(writer, "degenerateFaces", model.drawnAllowances.degenerateFaces);
    writeNumber(writer, "leastArea", model.drawnAllowances.leastArea);
    writeNumber(writer, "largestArea", model.drawnAllowances.largestArea);
    writeNumber(writer, "volumeError", model.drawnAllowances.volumeError);
    writeBox(writer, "innerBounds", model.drawnAllowances.innerBounds);
    writer.EndObject();
    std::puts(buffer.GetString());
}

} // namespace

int main(int argc, char** argv) {
    if (argc != 2) {
        std::fprintf(stderr, "usage: model_stats FILE\n");
        return 1;
    }
    Assimp::Importer importer;
    const aiScene* scene = importer.ReadFile(argv[1], 0);
    if (!scene || !scene->mRootNode) {
        std::fprintf(stderr, "model_stats: %s: %s\n", argv[1], importer.GetErrorString());
        return 2;
    }
    Model model;
    std::vector<bool> met(scene->mNumMeshes, false);
    addNode(model, met, *scene, *scene->mRootNode, worldFromFile(*scene, lowerExtension(argv[1])));
    print(model);
    return 0;
}
