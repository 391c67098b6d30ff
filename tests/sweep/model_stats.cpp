// model_stats FILE: what a model file holds before any export, as JSON. Exit code 2 if it can't be
// read. Reads with the assimp library and leaves polygons as they are.

#include "polygon.h"
#include "stats_json.h"

#include <assimp/Importer.hpp>
#include <assimp/scene.h>

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

Matrix toMatrix(const aiMatrix4x4& m) {
    return {m.a1, m.b1, m.c1, m.d1, m.a2, m.b2, m.c2, m.d2,
            m.a3, m.b3, m.c3, m.d3, m.a4, m.b4, m.c4, m.d4};
}

double unitScaleFactor(const aiMetadata& metadata) {
    double factor = 1;
    float narrow = 1;
    if (metadata.Get("UnitScaleFactor", narrow)) {
        factor = narrow;
    } else {
        metadata.Get("UnitScaleFactor", factor);
    }
    return factor;
}

/// From the file's axes and unit to Y up and metres. COLLADA and 3DS files carry this turn in
/// their root node already, and files of other formats are taken as they are.
Matrix worldFromFile(const aiScene& scene, std::string_view extension) {
    if (extension != "fbx" || !scene.mMetaData) {
        return {1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1};
    }
    const double metres = 0.01 * unitScaleFactor(*scene.mMetaData);
    int upAxis = 1;
    int upSign = 1;
    scene.mMetaData->Get("UpAxis", upAxis);
    scene.mMetaData->Get("UpAxisSign", upSign);
    const double up = upSign < 0 ? -metres : metres;
    switch (upAxis) {
    case 0: // (x, y, z) -> (-y, x, z)
        return {0, up, 0, 0, -up, 0, 0, 0, 0, 0, metres, 0, 0, 0, 0, 1};
    case 2: // (x, y, z) -> (x, z, -y)
        return {metres, 0, 0, 0, 0, 0, -up, 0, 0, up, 0, 0, 0, 0, 0, 1};
    default:
        return {metres, 0, 0, 0, 0, up, 0, 0, 0, 0, up, 0, 0, 0, 0, 1};
    }
}

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
    const std::string_view path = argv[1];
    std::string extension(path.substr(path.rfind('.') + 1));
    for (char& c : extension) {
        c = static_cast<char>(c >= 'A' && c <= 'Z' ? c - 'A' + 'a' : c);
    }
    Model model;
    std::vector<bool> met(scene->mNumMeshes, false);
    addNode(model, met, *scene, *scene->mRootNode, worldFromFile(*scene, extension));
    print(model);
    return 0;
}
