#include "model_world.h"

using namespace test_support;

namespace {

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

} // namespace

Matrix toMatrix(const aiMatrix4x4& m) {
    return {m.a1, m.b1, m.c1, m.d1, m.a2, m.b2, m.c2, m.d2,
            m.a3, m.b3, m.c3, m.d3, m.a4, m.b4, m.c4, m.d4};
}

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

std::string lowerExtension(std::string_view path) {
    std::string extension(path.substr(path.rfind('.') + 1));
    for (char& c : extension) {
        c = static_cast<char>(c >= 'A' && c <= 'Z' ? c - 'A' + 'a' : c);
    }
    return extension;
}
