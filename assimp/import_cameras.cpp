#include "assimp/import_cameras.h"

#include "assimp/library_text.h"
#include "assimp/placed_node.h"

#include "b_log.h"
#include "scene_schema.h"

#include <assimp/scene.h>

#include <cmath>
#include <numbers>

namespace assimp {

using base::IPlugin;
using base::ref;
using scene::camera_schema;

namespace {

constexpr base::u8 fitWidth = 1;

ref<IPlugin> makeCamera(const aiCamera& camera, base::PluginFactory& factory) {
    ref<IPlugin> object = factory.create(camera_schema::n_kind);
    if (camera.mName.length != 0)
        write(*object, camera_schema::n_name) = viewOf(camera.mName);
    base::vec2f sensor = camera_schema::n_sensor.defaultValue;
    if (std::isfinite(camera.mAspect) && camera.mAspect > 0)
        sensor.y = sensor.x / camera.mAspect;
    write(*object, camera_schema::n_sensor) = sensor;
    write(*object, camera_schema::n_sensorFit) = fitWidth;
    const double angle = camera.mHorizontalFOV;
    if (angle > 0 && angle < std::numbers::pi)
        write(*object, camera_schema::n_focalLength) =
            static_cast<float>(sensor.x / 2 / std::tan(angle / 2));
    return object;
}

} // namespace

void importCameras(const aiScene& source, NodeTable& nodes, base::PluginFactory& factory,
                   const base::string& path) {
    base::u64 strayCount = 0;
    for (base::u32 i = 0; i < source.mNumCameras; ++i) {
        const aiCamera& camera = *source.mCameras[i];
        const aiNode* node = nodes.find(viewOf(camera.mName));
        IPlugin* object = node ? nodes.objectOf(*node) : nullptr;
        strayCount += !object;
        if (object)
            addPlaced(*object, {camera.mPosition, camera.mLookAt, camera.mUp},
                      makeCamera(camera, factory), factory);
    }
    if (strayCount != 0)
        base::log().log(base::logScene, base::logWarning,
                        "assimp |{}| Left out {} cameras without a node of their name!", path,
                        strayCount);
}

} // namespace assimp
