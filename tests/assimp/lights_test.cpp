#include "file_builder.h"

#include <cmath>

namespace {

using namespace scene;
using namespace test_support;
using namespace base;

template <class T>
T& add(T**& array, unsigned& count, const char* name) {
    T** longer = new T*[count + 1];
    std::copy(array, array + count, longer);
    longer[count] = new T;
    delete[] array;
    array = longer;
    array[count]->mName = name;
    return *array[count++];
}

class Lights : public FileImport {
protected:
    aiLight& light(FileBuilder& file, aiLightSourceType type, const char* name = "lamp") {
        aiLight& light = add(file.scene->mLights, file.scene->mNumLights, name);
        light.mType = type;
        light.mColorDiffuse = {1, 1, 1};
        light.mDirection = {0, 0, -1};
        light.mUp = {0, 1, 0};
        return light;
    }
    aiCamera& camera(FileBuilder& file, const char* name = "lamp") {
        aiCamera& camera = add(file.scene->mCameras, file.scene->mNumCameras, name);
        camera.mLookAt = {0, 0, -1};
        return camera;
    }
    /// The node that has `object` among its children.
    INode& holder(const base::IPlugin& object) {
        for (auto* node : objects(node_schema::n_kind))
            for (const auto& child : valuesOf(*node, node_schema::n_children))
                if (child.get() == &object)
                    return dynamic_cast<INode&>(*node);
        throw std::runtime_error("no holder");
    }
};

TEST_F(Lights, ColorsConesAndFading) {
    const float pi = std::acos(-1.0f);
    FileBuilder file;
    file.node("lamp", file.root());
    aiLight& spot = light(file, aiLightSource_SPOT);
    spot.mColorDiffuse = {2, 4, 1};
    spot.mAngleOuterCone = pi / 3;
    spot.mAngleInnerCone = pi / 4;
    spot.mAttenuationConstant = 2;
    spot.mAttenuationQuadratic = 8;
    importFile(file);
    const base::IPlugin& object = only(light_schema::n_kind);
    EXPECT_EQ(read(object, light_schema::n_lightType), 2);
    EXPECT_EQ(read(object, light_schema::n_color), (vec3f{0.5f, 1, 0.25f}));
    EXPECT_EQ(read(object, light_schema::n_intensity), 4);
    EXPECT_FLOAT_EQ(read(object, light_schema::n_spotConeAngle), 60);
    EXPECT_NEAR(read(object, light_schema::n_spotPenumbraAngle), 15, 1e-5);
    EXPECT_EQ(holder(object).getName(), "lamp");

    const struct {
        float constant, linear, quadratic, size;
    } cases[] = {{1, 0, 4, 0.5f},  {0, 0, 0.002f, 0}, {1, 0.5f, 0, 4},
                 {1, 1, 0.25f, 2}, {1, 0, 0, 1e6f},   {NAN, 0, 1, 0}};
    for (const auto& c : cases) {
        FileBuilder lamps;
        lamps.node("lamp", lamps.root());
        aiLight& point = light(lamps, aiLightSource_POINT);
        point.mAttenuationConstant = c.constant;
        point.mAttenuationLinear = c.linear;
        point.mAttenuationQuadratic = c.quadratic;
        importFile(lamps);
        EXPECT_FLOAT_EQ(read(only(light_schema::n_kind), light_schema::n_size), c.size);
    }
    // Lengths of the file are those of its root: here of centimetres.
    FileBuilder area;
    aiMatrix4x4::Scaling(aiVector3D(0.01f), area.root().mTransformation);
    area.node("lamp", area.root());
    light(area, aiLightSource_AREA).mSize = {50, 100};
    importFile(area);
    EXPECT_EQ(read(only(light_schema::n_kind), light_schema::n_lightType), 3);
    EXPECT_FLOAT_EQ(read(only(light_schema::n_kind), light_schema::n_size), 0.5f);
    EXPECT_EQ(read(only(light_schema::n_kind), light_schema::n_sizeRatio), 2);
}

TEST_F(Lights, OwnPlacesAreNodes) {
    const struct {
        aiVector3D direction, up, position;
        bool ownNode;
    } cases[] = {{{0, 0, -3}, {0, 2, 0}, {}, false},
                 {{0, -1, 0}, {0, 0, -1}, {}, true},
                 {{1, 0, 0}, {0, 1, 0}, {4, 5, 6}, true},
                 {{0, 2, 0}, {0, 1, 0}, {}, true},  // up along the line of sight
                 {{0, 0, 0}, {0, 0, 0}, {}, false}, // nothing told
                 {{NAN, 0, 0}, {0, 1, 0}, {NAN, 0, 0}, false}};
    for (const auto& c : cases) {
        SCOPED_TRACE(&c - cases);
        FileBuilder file;
        file.node("lamp", file.root());
        aiCamera& source = camera(file);
        source.mLookAt = c.direction;
        source.mUp = c.up;
        source.mPosition = c.position;
        source.mHorizontalFOV = std::acos(0.0f); // a right angle
        source.mAspect = 1.5f;
        importFile(file);
        base::IPlugin& object = only(camera_schema::n_kind);
        INode& node = holder(object);
        EXPECT_EQ(objects(node_schema::n_kind).size(), c.ownNode ? 3u : 2u);
        EXPECT_EQ(node.getName(), "lamp");
        mat43 m;
        node.getTransform(m);
        if (c.ownNode) {
            // -Z is the direction, and the frame is none that mirrors.
            const float size = c.direction.Length();
            EXPECT_NEAR(-m.m.r0.z, c.direction.x / size, 1e-6);
            EXPECT_NEAR(-m.m.r1.z, c.direction.y / size, 1e-6);
            EXPECT_NEAR(-m.m.r2.z, c.direction.z / size, 1e-6);
            EXPECT_EQ(m.t, (vec3d{c.position.x, c.position.y, c.position.z}));
            EXPECT_GT(read(node, node_schema::n_scale).x * read(node, node_schema::n_scale).y *
                          read(node, node_schema::n_scale).z,
                      0);
        }
        // 36 mm wide at a right angle.
        EXPECT_FLOAT_EQ(read(object, camera_schema::n_focalLength), 18);
        EXPECT_EQ(read(object, camera_schema::n_sensor), (vec2f{36, 24}));
        const vec2f sensor = read(object, camera_schema::n_sensor);
        EXPECT_NEAR(getFieldOfView(sensor.x, sensor.y, read(object, camera_schema::n_focalLength),
                                   read(object, camera_schema::n_sensorFit), 1.5f),
                    std::acos(0.0), 1e-6);
    }
}

TEST_F(Lights, WhatHasNoPlaceIsToldOf) {
    const auto build = [&](FileBuilder& file) {
        file.node("lamp", file.root());
        light(file, aiLightSource_AMBIENT);
        light(file, aiLightSource_POINT, "elsewhere");
        camera(file, "nowhere");
        light(file, aiLightSource_DIRECTIONAL);
        camera(file);
    };
    FileBuilder file;
    build(file);
    LogCapture log;
    importFile(file);
    const std::string start = "3 assimp |" + path() + "| ";
    EXPECT_EQ(problems(log), start + "The file has no geometry!\n" + start +
                                 "Left out 1 lights without a node of their name!\n" + start +
                                 "Left out 1 ambient lights or lights of unknown kind!\n" + start +
                                 "Left out 1 cameras without a node of their name!\n");
    EXPECT_EQ(objects(light_schema::n_kind).size(), 1u);
    EXPECT_EQ(objects(camera_schema::n_kind).size(), 1u);

    set(Settings::n_importLights, false);
    set(Settings::n_importCameras, false);
    FileBuilder again;
    build(again);
    importFile(again);
    EXPECT_TRUE(objects(light_schema::n_kind).empty());
    EXPECT_TRUE(objects(camera_schema::n_kind).empty());
}

} // namespace
