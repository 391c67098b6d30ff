#pragma once

#include "b_containers.h"
#include "b_refcnt.h"
#include "b_types.h"

#include <array>
#include <limits>
#include <optional>

/// A write-only object model of a glTF 2.0 document.
///
/// The exporter builds a graph of counted objects under an `Asset`, the asset's passes rearrange
/// it, and one `writeJSON` streams it as text. No object has an index while the graph is built:
/// `Asset::writeJSON` numbers what it meets, in the order in which it meets it, so it can run
/// once per graph. Numbers named `i32` are written as such; floats are held in single precision.
/// Nothing here is safe to use from two threads.
namespace GLTF {

using base::flat_map;
using base::i32;
using base::i64;
using base::ref;
using base::string;
using base::string_view;
using base::u32;
using base::u64;
using base::u8;
using base::vector;

class Accessor;
class Asset;
class JsonWriter;
class Node;
class Technique;

/// Key of the Draco extension in `Object::extensions` of a primitive.
constexpr string_view dracoExtensionName = "KHR_draco_mesh_compression";

/// Switches that every writer receives.
struct Options {
    string name; ///< base of side file names
    bool embedBuffers = true;
    bool embedTextures = true;
    bool embedShaders = true;
    bool binary = false;
    bool packOcclusionTexture = false;
    bool keepMaterialsCommon = false;
    bool doubleSidedMaterials = false;
    bool generateShaders = false;
    bool useSpecularGlossiness = false;
    string version; ///< empty or "2.0"
    vector<string> metallicRoughnessImagePaths;
    bool useDraco = false;
    // Quantisation bits by kind of attribute.
    i32 positionBits = 14;
    i32 normalBits = 10;
    i32 texCoordBits = 10;
    i32 colorBits = 8;
    i32 jointBits = 8; ///< all attributes of no kind of their own: tangents and weights too
};

class Extension;

/// Base of the counted classes here. A document has a dozen objects for every mesh, so they have
/// memory of their own, see object_pool.h.
class Counted : public base::RefCnt {
public:
    static void* operator new(std::size_t byteCount);
    static void operator delete(void* block, std::size_t byteCount) noexcept;
};

/// Base of everything that is written as a JSON object.
class Object : public Counted {
public:
    ~Object() override;
    /// What `getStringId` begins with.
    virtual string typeName() const;
    /// Copies the state into `target`, sharing what is referenced, and returns it. `stringId`
    /// stays.
    virtual Object* clone(Object* target) const;
    /// Writes the members into the JSON object that the caller has opened, the class's own
    /// first, then "name", "extensions" and "extras" where they hold anything.
    virtual void writeJSON(JsonWriter& writer, const Options& options);
    /// `stringId`, or type name, "_" and `id` where that is empty.
    string getStringId() const;

private:
    friend class Walk;
    u32 walkMark_ = 0; ///< number of the last walk that took this object

public:
    i32 id = -1; ///< index in the top-level array of its kind; -1 until it is written
    string stringId;
    string name; ///< written where not empty
    flat_map<string, ref<Extension>> extensions;
    flat_map<string, ref<Object>> extras;
};

class Extension : public Object {
public:
    ~Extension() override;
};

// Bulk data

/// A block of bytes: owned and freed at the end, or borrowed.
class Buffer : public Object {
public:
    /// Owns `byteLength` bytes of undefined content.
    explicit Buffer(i32 byteLength);
    /// Owns a copy of `data`, or (without `copy`) borrows it.
    Buffer(const void* data, i32 byteLength, bool copy);
    ~Buffer() override;
    /// A buffer that owns `byteLength` zero bytes.
    static ref<Buffer> zeroed(i32 byteLength);
    string typeName() const override;
    void writeJSON(JsonWriter& writer, const Options& options) override;

    u8* data = nullptr; ///< from `base::AllocPolicy` where owned
    bool ownsData = false;
    i32 byteLength = 0;
    string uri; ///< filled by `writeJSON`
};

class BufferView : public Object {
public:
    static constexpr i32 noTarget = -1;
    static constexpr i32 arrayBuffer = 34962;
    static constexpr i32 elementArrayBuffer = 34963;

    BufferView(i32 byteOffset, i32 byteLength, ref<Buffer> buffer, i32 target);
    /// A view of the whole of a new `Buffer(data, byteLength, copy)`.
    BufferView(const void* data, i32 byteLength, i32 target, bool copy);
    ~BufferView() override;
    string typeName() const override;
    void writeJSON(JsonWriter& writer, const Options& options) override;

    ref<Buffer> buffer;
    i32 byteOffset = 0; ///< into the buffer
    i32 byteStride = 0; ///< 0: tightly packed
    i32 byteLength = 0;
    i32 target = noTarget;
};

/// glTF's numbers of component types.
enum ComponentType : i32 {
    componentI8 = 5120,
    componentU8 = 5121,
    componentI16 = 5122,
    componentU16 = 5123,
    componentU32 = 5125,
    componentFloat = 5126,
};

/// `count` elements of one type in a view.
class Accessor : public Object {
public:
    enum class Type : i32 { scalar, vec2, vec3, vec4, mat2, mat3, mat4 };

    Accessor(Type type, i32 componentType);
    /// Copies `count` elements into a buffer and view of its own and computes their bounds. Null
    /// data or a count below 1 give an accessor without elements and bounds.
    Accessor(Type type, i32 componentType, const void* data, i32 count, i32 target);
    /// Elements of an existing view, without bounds.
    Accessor(Type type, i32 componentType, i32 byteOffset, i32 count, ref<BufferView> view);
    ~Accessor() override;
    string typeName() const override;
    void writeJSON(JsonWriter& writer, const Options& options) override;

    static i32 numberOfComponents(Type type);
    /// Bytes of one component; 0 for a number that is no component type.
    static i32 componentByteLength(i32 componentType);
    static const char* typeText(Type type);
    i32 getNumberOfComponents() const { return numberOfComponents(type); }
    i32 getComponentByteLength() const { return componentByteLength(componentType); }
    /// The view's stride, or the size of an element where that is 0.
    i32 getByteStride() const;

    /// One element as floats, one per component. Integers are converted by value; bytes outside
    /// the buffer read as 0. False for a number that is no component type.
    bool getComponentsAtIndex(i32 index, float* out) const;
    /// The reverse; floats are truncated for integer components. Must lie in the buffer.
    bool writeComponentsAtIndex(i32 index, const float* in);

    /// Makes `min` and `max` where they are missing, undefined in content.
    void allocateMinMax();
    /// Sets `min` and `max` to the bounds of the elements, component by component, compared as
    /// floats. Does nothing without elements.
    bool computeMinMax();

    ref<BufferView> bufferView; ///< null once Draco has taken the data over
    i32 byteOffset = 0;         ///< into the view
    i32 componentType;
    i32 count = 0;
    std::unique_ptr<float[]> max; ///< one float per component, or null
    std::unique_ptr<float[]> min;
    Type type;
};

// Pictures and materials

/// A picture: its place in the document and, where it was read, the bytes of its file.
class Image : public Object {
public:
    /// An image without data, written by reference.
    Image(string uri, string cacheKey);
    /// Takes over `data` (from `base::AllocPolicy`); the media type comes from its first bytes,
    /// else from `fileExtension`.
    Image(string uri, u8* data, i32 byteLength, const string& fileExtension, string cacheKey);
    ~Image() override;
    string typeName() const override;
    void writeJSON(JsonWriter& writer, const Options& options) override;

    /// The image of the file at `path`, the same object for the same path until `clearCache`. A
    /// file that can't be read, or is none, gives an image without data.
    static ref<Image> load(const string& path);
    /// As `load`, but outside the cache: for files that will be replaced or removed.
    static ref<Image> loadUncached(const string& path);
    static void clearCache();

    struct Dimensions {
        i32 width = -1, height = -1;
    };
    /// Size in pixels from the header of a PNG or JPEG; -1, -1 for all else.
    Dimensions getDimensions() const;
    /// Copies the bytes to `view`, where they fit; `data` are those there from then on. So there
    /// is but one copy of a picture at a time.
    void moveInto(ref<BufferView> view);

    string uri;
    u8* data = nullptr; ///< owned, unless it was moved into a buffer
    i32 byteLength = 0;
    string mimeType;
    ref<BufferView> bufferView; ///< set when the image lies in the binary buffer
    string cacheKey;

private:
    bool ownsData_ = true;
};

class Sampler : public Object {
public:
    Sampler() = default;
    Sampler(i32 magFilter, i32 minFilter, i32 wrapS, i32 wrapT);
    ~Sampler() override;
    string typeName() const override;
    void writeJSON(JsonWriter& writer, const Options& options) override;

    i32 magFilter = 0, minFilter = 0, wrapS = 0, wrapT = 0;
};

class Texture : public Object {
public:
    ~Texture() override;
    string typeName() const override;
    /// Must have both members.
    void writeJSON(JsonWriter& writer, const Options& options) override;

    ref<Sampler> sampler;
    ref<Image> source;
};

/// Base of the kinds of materials, and the plain kind, which a technique draws.
class Material : public Object {
public:
    enum class Type : i32 { plain = 0, common = 1, pbr = 2 };

    /// Inputs of the plain and common kinds. What is not set is not written.
    struct Values {
        struct Slot {
            ref<Texture> texture; ///< takes the place of the colour
            std::optional<std::array<float, 4>> color;
        };
        /// Writes the members into the JSON object that the caller has opened.
        void writeJSON(JsonWriter& writer) const;

        Slot ambient, diffuse, emission, specular;
        std::optional<float> shininess, transparency;
    };

    Material();
    ~Material() override;
    string typeName() const override;
    void writeJSON(JsonWriter& writer, const Options& options) override;

    ref<Technique> technique;
    Type type = Type::plain;
    std::unique_ptr<Values> values; ///< null where there are none
};

class MaterialPBR : public Material {
public:
    class Texture : public Object {
    public:
        ~Texture() override;
        void writeJSON(JsonWriter& writer, const Options& options) override;

        float scale = 1;
        ref<GLTF::Texture> texture;
        i32 texCoord = -1;
    };

    class MetallicRoughness : public Object {
    public:
        ~MetallicRoughness() override;
        void writeJSON(JsonWriter& writer, const Options& options) override;

        std::array<float, 4> baseColorFactor{}; ///< not written while its alpha is 0
        ref<Texture> baseColorTexture;
        float metallicFactor = -1;  ///< not written while negative
        float roughnessFactor = -1; ///< not written while negative
        ref<Texture> metallicRoughnessTexture;
    };

    class SpecularGlossiness : public Object {
    public:
        ~SpecularGlossiness() override;
        void writeJSON(JsonWriter& writer, const Options& options) override;

        std::optional<std::array<float, 4>> diffuseFactor;
        ref<Texture> diffuseTexture;
        std::optional<std::array<float, 3>> specularFactor;
        ref<Texture> specularGlossinessTexture;
        float glossinessFactor = -1;
    };

    MaterialPBR();
    ~MaterialPBR() override;
    void writeJSON(JsonWriter& writer, const Options& options) override;

    ref<MetallicRoughness> metallicRoughness;
    ref<Texture> normalTexture;
    ref<Texture> occlusionTexture;
    /// Three factors and a marker: written if the first factor or the marker is not 0.
    std::array<float, 4> emissiveFactor{};
    ref<Texture> emissiveTexture;
    ref<SpecularGlossiness> specularGlossiness;
    string alphaMode;
    float alphaCutoff = std::numeric_limits<float>::quiet_NaN(); ///< NaN: unset
    bool doubleSided = false;
};

/// The material kind of the extension that carries lights. The exporter makes none, only lights.
class MaterialCommon : public Material {
public:
    enum class Kind : i32 { blinn, phong, lambert, constant };

    class Light : public Object {
    public:
        enum class Type : i32 { ambient, directional, point, spot, unknown };
        ~Light() override;
        string typeName() const override;
        void writeJSON(JsonWriter& writer, const Options& options) override;

        Type type = Type::unknown;
        std::array<float, 4> color{};
        float constantAttenuation = 0, linearAttenuation = 0, quadraticAttenuation = 0;
        float fallOffAngle = 3.1415927f; ///< radians
        float fallOffExponent = 0;
    };
    MaterialCommon() { type = Type::common; }
    ~MaterialCommon() override;
    void writeJSON(JsonWriter& writer, const Options& options) override;
    /// The features of this material, each ended by ";": materials of the same key could be drawn
    /// by the same technique.
    string techniqueKey() const;

    Kind technique = Kind::lambert; ///< how light is reflected; no generated technique
    i32 jointCount = 0;             ///< of the skins that it is used with; 0 without one
    bool transparent = false;
    bool doubleSided = false;
};

// Techniques: how a plain material is drawn. They are records with their written forms; nothing
// here generates shaders. Empty members are left out.

/// The text of one shader.
class Shader : public Object {
public:
    static constexpr i32 fragmentShader = 35632;
    static constexpr i32 vertexShader = 35633;

    explicit Shader(i32 shaderType) : type(shaderType) {}
    ~Shader() override;
    string typeName() const override;
    void writeJSON(JsonWriter& writer, const Options& options) override;

    i32 type;
    string source;
    string uri; ///< filled by `writeJSON`
};

class Program : public Object {
public:
    ~Program() override;
    string typeName() const override;
    void writeJSON(JsonWriter& writer, const Options& options) override;

    base::set<string> attributes; ///< inputs of the vertex shader
    ref<Shader> fragmentShader;
    ref<Shader> vertexShader;
};

class Technique : public Object {
public:
    struct Parameter {
        string semantic;
        ref<Node> node;      ///< whose transform it is
        vector<float> value; ///< one number, or the components of a vector or matrix
        i32 count = 0;       ///< of elements; 0 where it is no array
        i32 type = 0;        ///< the number that WebGL has for it
    };
    /// Render states, by the numbers that WebGL has for them.
    struct States {
        vector<i32> enable;
        std::optional<bool> depthMask;
        vector<i32> blendEquationSeparate; ///< for colour and alpha
        vector<i32> blendFuncSeparate;     ///< source and target for colour, then for alpha
    };

    ~Technique() override;
    string typeName() const override;
    void writeJSON(JsonWriter& writer, const Options& options) override;

    flat_map<string, string> attributes; ///< parameter by the name in the shader
    flat_map<string, Parameter> parameters;
    ref<Program> program;
    States states;
    flat_map<string, string> uniforms; ///< parameter by the name in the shader
};

// Structure

using AttributeMap = flat_map<string, ref<Accessor>>;

class Primitive : public Object {
public:
    /// Attributes of one morph target; part of its primitive, without an index.
    class Target : public Counted {
    public:
        ~Target() override;
        AttributeMap attributes;
    };

    ~Primitive() override;
    Object* clone(Object* target) const override;
    void writeJSON(JsonWriter& writer, const Options& options) override;
    /// The compression of this primitive, null where it has none.
    class DracoExtension* draco() const;

    AttributeMap attributes;
    ref<Accessor> indices;
    ref<Material> material;
    i32 mode = -1; ///< glTF's number; -1, written too, for a topology it does not know
    vector<ref<Target>> targets;
};

class Mesh : public Object {
public:
    ~Mesh() override;
    string typeName() const override;
    Object* clone(Object* target) const override;
    void writeJSON(JsonWriter& writer, const Options& options) override;

    vector<ref<Primitive>> primitives;
    vector<float> weights; ///< of the morph targets
};

class Skin : public Object {
public:
    ~Skin() override;
    string typeName() const override;
    void writeJSON(JsonWriter& writer, const Options& options) override;

    ref<Accessor> inverseBindMatrices;
    ref<Node> skeleton;
    vector<ref<Node>> joints; ///< null entries are not written
};

class Node : public Object {
public:
    /// Writes nothing of its own: an identity.
    class Transform : public Counted {
    public:
        enum class Type : i32 { none = -1, trs = 0, matrix = 1 };
        ~Transform() override;
        Type type = Type::none;
    };

    class TransformMatrix : public Transform {
    public:
        TransformMatrix(); ///< identity
        /// Transposes the sixteen values unless they are in column order.
        TransformMatrix(const float* sixteen, bool isColumnOrder);
        ~TransformMatrix() override;
        std::array<float, 16> matrix; ///< in column order, as glTF writes it
    };

    class TransformTRS : public Transform {
    public:
        /// The ten values are undefined: whoever makes one fills them.
        TransformTRS();
        ~TransformTRS() override;
        std::array<float, 3> translation;
        std::array<float, 4> rotation; ///< x, y, z, w
        std::array<float, 3> scale;
    };

    ~Node() override;
    string typeName() const override;
    Object* clone(Object* target) const override;
    void writeJSON(JsonWriter& writer, const Options& options) override;

    ref<Object> camera; ///< never set: there is no camera class
    vector<ref<Node>> children;
    ref<Skin> skin;
    ref<Mesh> mesh;
    ref<MaterialCommon::Light> light;
    ref<Transform> transform;
};

class Animation : public Object {
public:
    class Sampler : public Object {
    public:
        ~Sampler() override;
        string typeName() const override;
        void writeJSON(JsonWriter& writer, const Options& options) override;

        ref<Accessor> input, output;
        string interpolation = "LINEAR";
        i32 path = 0;
    };

    class Channel : public Object {
    public:
        enum Path : i32 { translation = 0, rotation = 1, scale = 2, weights = 3 };

        class Target : public Object {
        public:
            Target();
            ~Target() override;
            void writeJSON(JsonWriter& writer, const Options& options) override;

            ref<Node> node;
            i32 path = translation;
        };

        Channel();
        ~Channel() override;
        void writeJSON(JsonWriter& writer, const Options& options) override;
        /// True if the channel can be written: a node with an index, an input and an output.
        bool isWritable() const;

        Animation::Sampler sampler; ///< members: never given to a `ref`
        Target target;
    };

    ~Animation() override;
    string typeName() const override;
    void writeJSON(JsonWriter& writer, const Options& options) override;

    vector<ref<Channel>> channels;
};

class Scene : public Object {
public:
    ~Scene() override;
    string typeName() const override;
    void writeJSON(JsonWriter& writer, const Options& options) override;

    vector<ref<Node>> nodes; ///< the roots
};

// Compression

/// glTF attribute names and their Draco attribute ids. They are written in the order of a chained
/// hash table with FNV-1 keys and prime numbers of buckets, which is part of the files' form: files
/// of the same scene compare byte by byte.
class DracoAttributeIds {
public:
    struct Entry {
        string name;
        i32 id;
        u32 hash;
    };
    void insert(string name, i32 id);
    i32 find(string_view name) const;                         ///< -1 if absent
    const vector<Entry>& entries() const { return entries_; } ///< in iteration order

private:
    void place(Entry entry);
    u32 bucketCount_ = 1;
    vector<Entry> entries_; ///< bucket by bucket, each from front to back
};

/// One Draco stream for a whole mesh; all primitives of the mesh share the object.
class DracoExtension : public Extension {
public:
    /// Takes a mesh for the encoder. `indices` (u32, three a face) may be null: then every three
    /// vertices of "POSITION" are a face. The values are read from the start of each accessor's
    /// private buffer when they are encoded; until then the extension holds the buffers.
    ///
    /// Null where the encoder would fail or crash: without "POSITION", with unequal counts, an
    /// index past the end, no face of three distinct vertices, or values that are not finite or
    /// whose range is not. `reason` then tells which.
    static ref<DracoExtension> make(const AttributeMap& attributes, ref<Buffer> indices,
                                    string& reason);
    ~DracoExtension() override;
    /// Writes "bufferView" and "attributes" and nothing else.
    void writeJSON(JsonWriter& writer, const Options& options) override;
    /// Encodes the mesh into `bufferView` and lets go of its buffers. False if the encoder refuses.
    bool encode(const Options& options);

    ref<BufferView> bufferView; ///< null until encoded
    DracoAttributeIds attributeToId;

private:
    struct Attribute {
        i32 kind; ///< the encoder's
        i32 components;
        i32 componentType;
        ref<Buffer> values;
    };
    DracoExtension() = default;

    u32 pointCount_ = 0;
    ref<Buffer> indices_;
    vector<Attribute> attributes_; ///< by id
};

// Root

class Asset : public Object {
public:
    class Metadata : public Object {
    public:
        ~Metadata() override;
        void writeJSON(JsonWriter& writer, const Options& options) override;

        string copyright;
        string generator = "TARNHOLD2GLTF";
        string version;
    };

    Asset();
    /// Releases the nodes one by one, so that a deep tree does not exhaust the stack.
    ~Asset() override;

    /// The default scene, made at first use.
    Scene& getDefaultScene();

    // Each element once, in the order of a walk from the roots of the default scene.
    vector<Node*> getAllNodes();
    vector<Mesh*> getAllMeshes();
    vector<Primitive*> getAllPrimitives();
    vector<Skin*> getAllSkins();
    vector<Material*> getAllMaterials();
    vector<Texture*> getAllTextures();
    vector<Image*> getAllImages();
    vector<Accessor*> getAllAccessors();
    /// The streams of compressed primitives; those that failed are left out.
    vector<BufferView*> getAllCompressedBufferViews();
    /// Attributes of the primitive in key order, then those of each target. With duplicates,
    /// without `indices`.
    static vector<Accessor*> getAllPrimitiveAccessors(const Primitive& primitive);

    // The passes, in the order in which they run.

    /// Joins all animations into one without a name.
    void mergeAnimations();
    /// Removes leaves that carry nothing, and what becomes such a leaf by that.
    void removeUnusedNodes(const Options& options);
    /// Takes the plain data of compressed primitives out of the document.
    void removeUncompressedBufferViews();
    /// Encodes all prepared meshes; false at the first that fails, which ends the pass.
    bool compressPrimitives(const Options& options);
    /// Moves the data of all accessors, and then all Draco streams, into one new buffer, and
    /// releases their private buffers. Gaps and surplus are zero. Throws `base::exception` if
    /// the whole passes 2^31 - 1 bytes.
    ref<Buffer> packAccessors();

    void requireExtension(const string& name);
    void useExtension(const string& name);

    /// Numbers all objects and writes the members of the document.
    void writeJSON(JsonWriter& writer, const Options& options) override;

    vector<ref<MaterialCommon::Light>> globalLights; ///< of removed nodes
    ref<Sampler> globalSampler;
    ref<Metadata> metadata;
    base::set<string> extensionsUsed;
    base::set<string> extensionsRequired;
    vector<ref<Scene>> scenes;
    vector<ref<Animation>> animations;
    i32 scene = -1; ///< index of the default scene
};

} // namespace GLTF
