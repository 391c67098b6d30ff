#include "scene_schema.h"

#include "scene_animation.h"
#include "scene_options.h"

#include "b_attribute_desc.h"
#include "b_cmdline.h"

namespace scene {

namespace {

/// Describes a type of scene objects.
template <class T>
class ObjectDesc : public base::IPluginDesc {
public:
    ObjectDesc() {
        version = 1;
        type = T::Schema::n_kind;
    }
    base::IPlugin* create(base::PluginFactory& factory, base::u32 id) override {
        return objectCreator<T>(this, &factory, id);
    }
};

/// The scene stands for the whole model: the options of import and export come with it.
class SceneDesc final : public ObjectDesc<IScene> {
public:
    void registerOptions(base::CmdLineOptions& options) override {
        options.add<base::u8>("scene", "-upAxis", "", "Set the up axis.",
                              scene_schema::n_upAxis.defaultValue);
        registerImporterOptions(options);
        registerExporterOptions(options);
    }
};

template <class T>
struct DescOf {
    using type = ObjectDesc<T>;
};
template <>
struct DescOf<IScene> {
    using type = SceneDesc;
};

/// The one description of a type in this module.
template <class T>
const base::ref<base::IPluginDesc>& description() {
    static const base::ref<base::IPluginDesc> desc = base::makeRef<typename DescOf<T>::type>();
    return desc;
}

/// Tells what T's type derives from, up to the objects without a schema.
template <class T>
void registerClass() {
    if constexpr (requires { typename T::Parent::Schema; }) {
        base::attribDescManager().addClass(T::Schema::n_kind, T::Parent::Schema::n_kind);
        registerClass<typename T::Parent>();
    }
}

template <class... T>
void registerTypes(base::PluginFactory& factory) {
    (factory.registerDesc(description<T>()), ...);
    (registerClass<T>(), ...);
}

#define SCENE_INTERN(type) internNames(type##_schema::names());

bool internSceneNames() {
    SCENE_SCHEMAS(SCENE_INTERN)
    return true;
}

bool internViewportNames() {
    SCENE_VIEWPORT_SCHEMAS(SCENE_INTERN)
    return true;
}

} // namespace

void internNames(std::span<SchemaName* const> names) {
    base::NameServer& server = base::nameServer();
    for (SchemaName* name : names)
        name->id = server.id(name->text);
}

void register_scene_schema(base::PluginFactory& factory) {
    static const bool interned = internSceneNames();
    static_cast<void>(interned);
    registerTypes<IScene, ILight, IBufferAdapter, IBuffer, ITexture, IRandomTexture, INoiseTexture,
                  IVertColorTexture, ICellularTexture, ICheckerTexture, IEmbeddedTexture,
                  ICurvatureTexture, IFileTexture, ICubistTexture, IDotsTexture, IMixTexture,
                  IPrincipalMaterial, IHairMaterial, IToonMaterial, ILightGroup, INode,
                  IKeyframeChannel, IAnimLayer, IInstancer, IAnimClip, ILines, IPoints, IHair, IFur,
                  IMesh, ISkin, IMorph, IEnvironment, ICamera, IClipPlane, IRenderOutput,
                  ISceneReference, IMetadata>(factory);
}

void register_viewport_schema(base::PluginFactory& factory) {
    static const bool interned = internViewportNames();
    static_cast<void>(interned);
    registerTypes<IViewport, IPopupWindow, IViewportWindow>(factory);
}

} // namespace scene
