#pragma once

#include "import_fixture.h"

#include <assimp/scene.h>

#include <string>
#include <vector>

namespace test_support {

/// Builds what the library would make of a file. Everything belongs to `scene`.
class FileBuilder {
public:
    FileBuilder();

    aiNode& node(const std::string& name, aiNode& parent,
                 const aiMatrix4x4& transform = aiMatrix4x4());
    aiNode& root() { return *scene->mRootNode; }
    /// A mesh of triangles with a vertex for each corner, used by `user`.
    aiMesh& mesh(aiNode& user, const std::vector<aiVector3D>& corners);
    void use(aiNode& user, unsigned mesh);

    using Weights = std::vector<std::pair<unsigned, float>>;
    static void bone(aiMesh& mesh, const std::string& name, const aiMatrix4x4& offset,
                     const Weights& weights);
    /// A target of which vertex v is moved by `differences[v]`.
    static aiAnimMesh& target(aiMesh& mesh, const std::string& name, float weight,
                              const std::vector<aiVector3D>& differences);

    aiAnimation& animation(double ticksPerSecond, double duration);
    struct Keys {
        std::vector<std::pair<double, aiVector3D>> positions{};
        std::vector<std::pair<double, aiQuaternion>> rotations{};
        std::vector<std::pair<double, aiVector3D>> scales{};
    };
    static aiNodeAnim& channel(aiAnimation& animation, const std::string& node, const Keys& keys);
    /// `keys`: time and the weights of targets 0, 1 and so on.
    static void weights(aiAnimation& animation, const std::string& name,
                        const std::vector<std::pair<double, std::vector<double>>>& keys);

    std::unique_ptr<aiScene> scene;
};

aiMatrix4x4 translated(float x, float y, float z);
/// A turn about an axis, in degrees.
aiQuaternion turned(float degrees, const aiVector3D& axis);
aiMatrix4x4 matrixOf(const aiQuaternion& rotation);

/// Imports scenes of the library's as if they were files.
class FileImport : public Import {
protected:
    /// `name` is that of the file. Leaves `file` without meshes.
    base::IPlugin& importFile(FileBuilder& file, const std::string& name = "test.dae");
    base::string path(const std::string& name = "test.dae") { return (folder_ / name).string(); }
};

} // namespace test_support
