#include "GLTF/collect.h"
#include "GLTF/json_writer.h"
#include "GLTF/prefetch.h"

#include "b_base64.h"
#include "b_exception.h"

namespace GLTF {

namespace {

/// The objects of one top-level array, in the order of their indices.
template <class T>
class IndexedList {
public:
    /// Gives an object without an index the next one.
    void add(const ref<T>& object) { add(object.get()); }
    void add(T* object) {
        if (!object || object->id >= 0)
            return;
        object->id = static_cast<i32>(objects_.size());
        objects_.push_back(object);
    }

    bool empty() const noexcept { return objects_.empty(); }
    const vector<T*>& objects() const noexcept { return objects_; }

private:
    vector<T*> objects_;
};

/// Writes the members of a document. A list is complete when its turn comes, because objects are
/// numbered while those that refer to them are written.
class DocumentWriter {
public:
    DocumentWriter(Asset& asset, JsonWriter& writer, const Options& options)
        : asset_(asset), writer_(writer), options_(options) {}

    void write() {
        writeMetadata();
        writeScenes();
        writeNodes();
        writeList("cameras", cameras_, [](Object&) {});
        writeList("meshes", meshes_, [this](Mesh& mesh) { number(mesh); });
        writeAnimations();
        writeList("skins", skins_,
                  [this](Skin& skin) { accessors_.add(skin.inverseBindMatrices); });
        writeList("accessors", accessors_, [this](Accessor& accessor) {
            views_.add(accessor.bufferView);
            prefetch(accessor.max.get());
            prefetch(accessor.min.get());
        });
        if (options_.useDraco)
            asset_.requireExtension(string(dracoExtensionName));
        writeList("materials", materials_, [this](Material& material) { number(material); });
        writeLights();
        writeList("textures", textures_, [this](Texture& texture) {
            samplers_.add(texture.sampler);
            images_.add(texture.source);
        });
        writeImages();
        writeList("samplers", samplers_, [](Sampler&) {});
        writeList("techniques", techniques_,
                  [this](Technique& technique) { programs_.add(technique.program); });
        writeList("programs", programs_, [this](Program& program) {
            shaders_.add(program.fragmentShader);
            shaders_.add(program.vertexShader);
        });
        writeList("shaders", shaders_, [](Shader&) {});
        writeList("bufferViews", views_, [this](BufferView& view) { buffers_.add(view.buffer); });
        writeBuffers();
        writeNames("extensionsRequired", asset_.extensionsRequired);
        writeNames("extensionsUsed", asset_.extensionsUsed);
    }

private:
    void writeObject(Object& object) {
        writer_.startObject();
        object.writeJSON(writer_, options_);
        writer_.endObject();
    }

    /// Calls `before` with each object before it is written. Goes by blocks: the numbering of a
    /// block is a short loop whose waits for memory overlap, and leaves the block in the cache.
    template <std::size_t N, class T, class Before>
    void writeList(const char (&name)[N], const IndexedList<T>& list, Before before) {
        if (list.empty())
            return;
        constexpr std::size_t blockLength = 32;
        const vector<T*>& objects = list.objects();
        writer_.reserve(objects.size() * estimatedObjectLength);
        writer_.startArray(name);
        for (std::size_t start = 0; start < objects.size(); start += blockLength) {
            const std::size_t end = std::min(start + blockLength, objects.size());
            for (std::size_t i = start; i < end; ++i) {
                if (i + blockLength < objects.size())
                    prefetch(objects[i + blockLength]);
                before(*objects[i]);
            }
            for (std::size_t i = start; i < end; ++i)
                writeObject(*objects[i]);
        }
        writer_.endArray();
    }

    template <std::size_t N>
    void writeNames(const char (&name)[N], const base::set<string>& names) {
        if (names.empty())
            return;
        writer_.startArray(name);
        for (const string& text : names)
            writer_.textValue(text);
        writer_.endArray();
    }

    void writeMetadata() {
        if (!asset_.metadata)
            return;
        writer_.key("asset");
        writeObject(*asset_.metadata);
    }

    void writeScenes() {
        if (!asset_.scenes.empty()) {
            writer_.startArray("scenes");
            const Walk walk;
            i32 position = 0;
            for (const ref<Scene>& scene : std::as_const(asset_.scenes)) {
                scene->id = position++;
                numberNodes(scene->nodes, walk);
                writeObject(*scene);
            }
            writer_.endArray();
        }
        if (asset_.scene >= 0)
            writer_.intMember("scene", asset_.scene);
    }

    /// Numbers the nodes below `roots`, the last of each list first.
    void numberNodes(const vector<ref<Node>>& roots, const Walk& walk) {
        vector<Node*> stack;
        const auto push = [&](const ref<Node>& node) {
            if (node)
                stack.push_back(node.get());
        };
        for (const ref<Node>& root : roots)
            push(root);
        while (!stack.empty()) {
            Node* node = stack.back();
            stack.pop_back();
            nodes_.add(node);
            if (!walk.take(*node))
                continue;
            for (const ref<Node>& child : std::as_const(node->children))
                push(child);
            if (node->skin)
                push(node->skin->skeleton);
        }
    }

    void writeNodes() {
        writeList("nodes", nodes_, [this](Node& node) {
            meshes_.add(node.mesh);
            skins_.add(node.skin);
            cameras_.add(node.camera);
            lights_.add(node.light);
        });
    }

    void number(const Mesh& mesh) {
        for (const ref<Primitive>& primitive : mesh.primitives) {
            prefetch(primitive.get());
            materials_.add(primitive->material);
            if (const DracoExtension* draco = primitive->draco())
                views_.add(draco->bufferView);
            accessors_.add(primitive->indices);
            collect::forEachAttribute(*primitive,
                                      [this](Accessor& accessor) { accessors_.add(&accessor); });
        }
    }

    /// The array opens with the first animation that has a channel to write: it must not be empty.
    void writeAnimations() {
        bool isOpen = false;
        i32 position = 0;
        for (const ref<Animation>& animation : std::as_const(asset_.animations)) {
            animation->id = position++;
            if (!numberSamplers(*animation))
                continue;
            if (!isOpen)
                writer_.startArray("animations");
            isOpen = true;
            writeObject(*animation);
        }
        if (isOpen)
            writer_.endArray();
    }

    /// False if the animation has no channel to write.
    bool numberSamplers(const Animation& animation) {
        bool found = false;
        for (const ref<Animation::Channel>& channel : animation.channels) {
            if (!channel->isWritable())
                continue;
            accessors_.add(channel->sampler.input);
            accessors_.add(channel->sampler.output);
            found = true;
        }
        return found;
    }

    void number(Material& material) {
        if (material.type == Material::Type::plain && material.technique) {
            techniques_.add(material.technique);
            asset_.requireExtension("KHR_technique_webgl");
        }
        collect::forEachValueTexture(
            material, [this](const ref<Texture>& texture) { textures_.add(texture); });
        if (material.type == Material::Type::common) {
            asset_.requireExtension("KHR_materials_common");
            hasCommonMaterial_ = true;
        }
        const auto* pbr = dynamic_cast<const MaterialPBR*>(&material);
        if (!pbr)
            return;
        if (const auto* block = pbr->metallicRoughness.get()) {
            numberTexture(block->baseColorTexture);
            numberTexture(block->metallicRoughnessTexture);
        }
        numberTexture(pbr->normalTexture);
        numberTexture(pbr->occlusionTexture);
        numberTexture(pbr->emissiveTexture);
        if (!options_.useSpecularGlossiness)
            return;
        asset_.useExtension("KHR_materials_pbrSpecularGlossiness");
        if (const auto* block = pbr->specularGlossiness.get()) {
            numberTexture(block->diffuseTexture);
            numberTexture(block->specularGlossinessTexture);
        }
    }

    void numberTexture(const ref<MaterialPBR::Texture>& slot) {
        if (slot)
            textures_.add(slot->texture);
    }

    /// Lights have their array only beside materials of the kind that knows them.
    void writeLights() {
        if (!hasCommonMaterial_ || lights_.empty())
            return;
        writer_.startObject("extensions");
        writer_.startObject("KHR_materials_common");
        writeList("lights", lights_, [](MaterialCommon::Light&) {});
        writer_.endObject();
        writer_.endObject();
    }

    void writeImages() {
        if (options_.embedTextures && !options_.binary) {
            std::size_t length = 0;
            for (const Image* image : images_.objects())
                length += base::base64Length(static_cast<std::size_t>(image->byteLength));
            writer_.reserve(length);
        }
        writeList("images", images_, [this](Image& image) { views_.add(image.bufferView); });
    }

    void writeBuffers() {
        if (options_.embedBuffers && !options_.binary) {
            std::size_t length = 0;
            for (const Buffer* buffer : buffers_.objects())
                length += base::base64Length(static_cast<std::size_t>(buffer->byteLength));
            writer_.reserve(length + estimatedObjectLength * buffers_.objects().size());
        }
        writeList("buffers", buffers_, [](Buffer&) {});
    }

    Asset& asset_;
    JsonWriter& writer_;
    const Options& options_;
    IndexedList<Node> nodes_;
    IndexedList<Mesh> meshes_;
    IndexedList<Skin> skins_;
    IndexedList<Object> cameras_;
    IndexedList<MaterialCommon::Light> lights_;
    IndexedList<Accessor> accessors_;
    IndexedList<Material> materials_;
    IndexedList<Texture> textures_;
    IndexedList<Image> images_;
    IndexedList<Sampler> samplers_;
    IndexedList<Technique> techniques_;
    IndexedList<Program> programs_;
    IndexedList<Shader> shaders_;
    IndexedList<BufferView> views_;
    IndexedList<Buffer> buffers_;
    bool hasCommonMaterial_ = false;
};

/// Takes the links between nodes apart, so that each is destroyed alone and cycles through joints
/// are freed as well.
void unlinkNodes(const vector<ref<Scene>>& scenes, const vector<ref<Animation>>& animations) {
    const Walk walk;
    vector<ref<Node>> nodes;
    const auto take = [&](const ref<Node>& node) {
        if (node && walk.take(*node))
            nodes.push_back(node);
    };
    for (const ref<Scene>& scene : scenes) {
        for (const ref<Node>& node : std::as_const(scene->nodes))
            take(node);
    }
    for (const ref<Animation>& animation : animations) {
        for (const ref<Animation::Channel>& channel : std::as_const(animation->channels))
            take(channel->target.node);
    }
    for (std::size_t i = 0; i < nodes.size(); ++i) {
        Node& node = *nodes[i];
        for (const ref<Node>& child : std::as_const(node.children))
            take(child);
        if (Skin* skin = node.skin.get()) {
            take(skin->skeleton);
            for (const ref<Node>& joint : std::as_const(skin->joints))
                take(joint);
        }
    }
    for (const ref<Node>& node : std::as_const(nodes)) {
        node->children.clear();
        node->skin.reset();
    }
}

} // namespace

Asset::Metadata::~Metadata() = default;

void Asset::Metadata::writeJSON(JsonWriter& writer, const Options& options) {
    if (!options.version.empty())
        version = options.version;
    if (!copyright.empty())
        writer.textMember("copyright", copyright);
    if (!generator.empty())
        writer.textMember("generator", generator);
    if (!version.empty())
        writer.textMember("version", version);
    Object::writeJSON(writer, options);
}

Asset::Asset()
    : globalSampler(base::makeRef<Sampler>(9729, 9986, 10497, 10497)),
      metadata(base::makeRef<Metadata>()) {}

Asset::~Asset() {
    try {
        unlinkNodes(scenes, animations);
    } catch (const std::bad_alloc&) {
        // Without memory for the list the nodes go with their parents.
    }
}

Scene& Asset::getDefaultScene() {
    if (scene < 0) {
        scenes.push_back(base::makeRef<Scene>());
        scene = 0;
        return *scenes.back();
    }
    if (static_cast<std::size_t>(scene) >= scenes.size())
        throw base::exception("The default scene is not among the scenes", "asset",
                              "GLTF::Asset::getDefaultScene", __LINE__);
    return *scenes[static_cast<std::size_t>(scene)];
}

void Asset::requireExtension(const string& name) {
    extensionsUsed.insert(name);
    extensionsRequired.insert(name);
}

void Asset::useExtension(const string& name) {
    extensionsUsed.insert(name);
}

void Asset::writeJSON(JsonWriter& writer, const Options& options) {
    DocumentWriter(*this, writer, options).write();
    Object::writeJSON(writer, options);
}

} // namespace GLTF
