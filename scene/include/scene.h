#pragma once

#include "b_factory.h"
#include "scene_config.h"
#include "scene_schema.h"

/// The classes of scene objects. An object is almost pure data: the attributes that its schema
/// names. It inherits its schema, so that `node->n_visible` names one of them.
///
/// An object whose type was not yet registered when it was made is none of these classes, though
/// its type has the right name; so classes are told by `dynamic_cast`, interfaces by
/// `findInterface`.
namespace scene {

class INode;

/// The interface T of `object`, null if it has none.
template <class T>
T* findInterface(base::IPlugin& object) {
    return static_cast<T*>(object.queryInterface(T::interfaceName()));
}

/// What has an extent.
class SCENE_API IBounded : public base::IPluginInterface {
public:
    static base::name_id interfaceName(); ///< "IBounded"
    base::name_id name() const override { return interfaceName(); }
    /// The stored box if it is finite and not empty, else that of the vertices; empty if there
    /// are none.
    virtual base::box3f getBounds() const = 0;
};

/// A place in the tree of nodes. Transforms are those at the scene's present time.
class SCENE_API IHierarchical : public base::IPluginInterface {
public:
    static base::name_id interfaceName(); ///< "IHierarchical"
    base::name_id name() const override { return interfaceName(); }

    /// The node that lists this one as its child, the first by id if several do. Searches the
    /// whole factory; null for a root.
    virtual INode* findParent() const = 0;
    /// Entries of the list of children, gaps included.
    virtual base::u32 getChildCount() const = 0;
    /// Null for a gap and past the end.
    virtual base::IPlugin* findChild(base::u32 index) const = 0;

    /// The transform relative to the parent, see `composeTransform`. A node that does not
    /// inherit its parent's transform gets one that undoes it. Finite as floats.
    virtual void getTransform(base::mat43& transform) const = 0;
    /// The product of the transforms from the root down.
    virtual void getWorldTransform(base::mat43& transform) const = 0;
    /// Sets what `getTransform` answers, see `storeTransform`. An animated node becomes static.
    virtual void setTransform(const base::mat43& transform) = 0;
    /// True if translation, scale or rotation is linked to an animation layer.
    virtual bool hasTransformChannels() const = 0;
    /// The times, on the scene's timeline, of the keys of these links; sorted, each once.
    virtual void getTransformKeyTimes(base::vector<base::TimeCode>& times) const = 0;
};

/// Declares a class of objects with nothing but a schema.
#define SCENE_CLASS(Class, Base, type)                                                       \
    class SCENE_API Class : public Base, public type##_schema {                              \
    public:                                                                                  \
        using Schema = type##_schema;                                                        \
        using Parent = Base;                                                                 \
        Class(base::ref<base::IPluginDesc> desc, base::PluginFactory* factory, base::u32 id) \
            : Base(std::move(desc), factory, id) {}                                          \
    };

class SCENE_API IScene : public base::IPlugin, public scene_schema, public base::Distance {
public:
    using Schema = scene_schema;
    using base::IPlugin::IPlugin;
};

class SCENE_API INode : public base::IPlugin,
                        public IBounded,
                        public IHierarchical,
                        public node_schema {
public:
    using Schema = node_schema;
    using base::IPlugin::IPlugin;

    base::IPlugin* plugin() override { return this; }
    base::IPluginInterface* queryInterface(base::name_id name) override;

    base::box3f getBounds() const override;

    INode* findParent() const override;
    base::u32 getChildCount() const override;
    base::IPlugin* findChild(base::u32 index) const override;
    void getTransform(base::mat43& transform) const override;
    void getWorldTransform(base::mat43& transform) const override;
    void setTransform(const base::mat43& transform) override;
    bool hasTransformChannels() const override;
    void getTransformKeyTimes(base::vector<base::TimeCode>& times) const override;

    /// What a transform does without.
    enum TransformFault : base::u8 {
        faultNotFinite = 1, ///< numbers that are not finite, defaults stand for them
        faultParent = 2,    ///< its parent's inverse: that is unknown or there is none
    };
    /// As `getTransform` for a caller that knows where it met the node: `parentWorld` is the
    /// world transform of that parent, null if there is none. Only a node that does not inherit
    /// looks at it. Returns the faults as bits.
    base::u32 getTransform(base::mat43& transform, const base::mat43* parentWorld) const;
};

class SCENE_API IGeometry : public base::IPlugin, public IBounded, public geometry_schema {
public:
    using Schema = geometry_schema;
    using base::IPlugin::IPlugin;

    base::IPlugin* plugin() override { return this; }
    base::IPluginInterface* queryInterface(base::name_id name) override;
    base::box3f getBounds() const override;
};

SCENE_CLASS(IPoints, IGeometry, points)
SCENE_CLASS(ILines, IGeometry, lines)
SCENE_CLASS(IHair, IGeometry, hair)
SCENE_CLASS(IFur, IGeometry, fur)
SCENE_CLASS(ISubdividable, IGeometry, subdividable)
SCENE_CLASS(IMesh, ISubdividable, mesh)
SCENE_CLASS(ISkin, ISubdividable, skin)
SCENE_CLASS(IMorph, ISubdividable, morph)
SCENE_CLASS(IInstancer, base::IPlugin, instancer)

SCENE_CLASS(IMaterial, base::IPlugin, material)
SCENE_CLASS(IPrincipalMaterial, IMaterial, principalMaterial)
SCENE_CLASS(IHairMaterial, IMaterial, hairMaterial)
SCENE_CLASS(IToonMaterial, IMaterial, toonMaterial)

SCENE_CLASS(ITexture, base::IPlugin, texture)
SCENE_CLASS(IBitmapTexture, ITexture, bitmapTexture)
SCENE_CLASS(IFileTexture, IBitmapTexture, fileTexture)
SCENE_CLASS(IEmbeddedTexture, IBitmapTexture, embeddedTexture)
SCENE_CLASS(IRandomTexture, ITexture, randomTexture)
SCENE_CLASS(INoiseTexture, ITexture, noiseTexture)
SCENE_CLASS(ICellularTexture, ITexture, cellularTexture)
SCENE_CLASS(ICheckerTexture, ITexture, checkerTexture)
SCENE_CLASS(ICubistTexture, ITexture, cubistTexture)
SCENE_CLASS(IDotsTexture, ITexture, dotsTexture)
SCENE_CLASS(IMixTexture, ITexture, mixTexture)
SCENE_CLASS(ICurvatureTexture, ITexture, curvatureTexture)
SCENE_CLASS(IVertColorTexture, ITexture, vertColorTexture)

SCENE_CLASS(ILight, base::IPlugin, light)
SCENE_CLASS(ILightGroup, base::IPlugin, lightGroup)
SCENE_CLASS(ICamera, base::IPlugin, camera)
SCENE_CLASS(IEnvironment, base::IPlugin, environment)
SCENE_CLASS(IClipPlane, base::IPlugin, clipPlane)
SCENE_CLASS(ISceneReference, base::IPlugin, sceneReference)
SCENE_CLASS(IMetadata, base::IPlugin, metadata)
SCENE_CLASS(IRenderOutput, base::IPlugin, renderOutput)
SCENE_CLASS(IBuffer, base::IPlugin, buffer)
SCENE_CLASS(IKeyframeChannel, base::IPlugin, keyframeChannel)
SCENE_CLASS(IAnimClip, base::IPlugin, animClip)
SCENE_CLASS(IViewport, base::IPlugin, viewport)
SCENE_CLASS(IPopupWindow, base::IPlugin, popupWindow)
SCENE_CLASS(IViewportWindow, base::IPlugin, viewportWindow)

/// Turns the bytes of a buffer into typed vectors: each output attribute that the adapter has
/// becomes a view of the chosen bytes, without a copy. The buffer is kept alive as long as the
/// views are. Who changes the buffer's data tells the adapter by `changed` or `afterLoad` before
/// the outputs are read again; exports call `afterLoad`.
class SCENE_API IBufferAdapter : public base::IPlugin,
                                 public bufferAdapter_schema,
                                 public base::PluginCallback {
public:
    using Schema = bufferAdapter_schema;
    using base::IPlugin::IPlugin;

    /// True for the inputs, whose changes refresh the outputs.
    bool isPathKeyed(const base::AttribPath& path) const override;
    /// Makes the outputs anew.
    void afterLoad(base::i32 version) override;
    /// Refreshes, unless the change is one of this adapter's own.
    void changed(base::u32 code, const base::AttribPath& path) override;

private:
    void refresh();
    base::ref<base::IPlugin> viewedBuffer_;
};

/// What the description of a type calls to make an object of class T. There is one per class and
/// module; a program that wants a class of its own (derived from T) replaces it before it makes
/// objects.
template <class T>
using ObjectCreator = T* (*)(base::ref<base::IPluginDesc>, base::PluginFactory*, base::u32 id);

template <class T>
inline ObjectCreator<T> objectCreator =
    [](base::ref<base::IPluginDesc> desc, base::PluginFactory* factory, base::u32 id) -> T* {
    return new T(std::move(desc), factory, id);
};

/// The path by which `attribute` is linked to an output of an animation layer, through other links
/// if need be; its root is the layer. Null if it is no such link.
const base::AttribPath* findLayerPath(const base::Attribute* attribute);

/// Field of view in radians of a sensor of `width` times `height` at `focalLength`, all in the
/// same unit. `fit`: 0 the height, or the width if `aspect` (width by height) is below 1, 1 the
/// width, 2 the height, 3 the diagonal; any other throws `base::switch_exception`.
float getFieldOfView(float width, float height, float focalLength, base::u8 fit, float aspect);

} // namespace scene
