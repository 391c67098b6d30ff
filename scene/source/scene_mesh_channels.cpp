#include "scene_mesh_channels.h"

#include "scene_mesh.h"
#include "scene_schema.h"

namespace scene {

using base::AttribMap;
using base::name_id;
using base::u32;

namespace {

template <class T>
std::unique_ptr<base::Attribute>
gatherElements(const Channel& channel, const base::vector<u32>& firstCorner, bool& outOfRange) {
    auto result = std::make_unique<base::TypedVectorAttribute<T>>();
    result->value().resizeUninitialized(firstCorner.size());
    T* to = result->value().data();
    const T* from = static_cast<const T*>(channel.data);
    for (const u32 corner : firstCorner) {
        const u32 index = channel.index(corner);
        const bool covered = channel.covers(index);
        *to++ = covered ? from[index] : T{};
        outOfRange |= !covered && index != channel.invalidIndex;
    }
    return result;
}

class ChannelCollector {
public:
    explicit ChannelCollector(AttribMap& owner, bool areKeys = true)
        : owner_(&owner), areKeys_(areKeys) {}

    void setIndices(name_id name) { ownIndices_ = findIndices(*owner_, name); }
    void setInvalidIndex(const u32* index) { invalidIndex_ = index ? *index : noIndex; }

    /// Adds the array under `name` if it is there and not empty; its elements are one of `Ts`.
    template <class... Ts>
    void add(base::vector<Channel>& channels, name_id name) {
        visitVector<Ts...>(*owner_, name, [&]<class T>(const base::vector<T>& elements) {
            static_assert(sizeof(T) % sizeof(u32) == 0);
            if (elements.empty())
                return;
            Channel& channel = channels.emplace_back();
            channel.owner = owner_;
            channel.name = name;
            channel.data = elements.data();
            channel.count = static_cast<u32>(elements.size());
            channel.wordCount = sizeof(T) / sizeof(u32);
            channel.isKey = areKeys_;
            channel.ownIndices = ownIndices_;
            channel.invalidIndex = invalidIndex_;
            channel.gather = gatherElements<T>;
        });
    }

private:
    AttribMap* owner_;
    bool areKeys_;
    const base::vector<u32>* ownIndices_ = nullptr;
    u32 invalidIndex_ = noIndex;
};

} // namespace

bool Channel::coversAll(u32 cornerCount) const {
    u32 beyond = 0;
    for (u32 c = 0; indexOfCorner && c < cornerCount; ++c)
        beyond |= !covers(indexOfCorner[c]);
    return indexOfCorner && beyond == 0;
}

const base::vector<u32>* findIndices(const AttribMap& map, name_id name) {
    const base::vector<u32>* indices = map.findVecAttribute<u32>(name);
    return indices && !indices->empty() ? indices : nullptr;
}

base::vector<Channel> collectChannels(AttribMap& mesh) {
    base::vector<Channel> channels;
    ChannelCollector own(mesh);
    own.setIndices(mesh_schema::n_positionIndices);
    own.add<base::vec3f>(channels, mesh_schema::n_positions);
    own.setIndices(mesh_schema::n_normalIndices);
    own.add<base::normal, base::vec3f>(channels, mesh_schema::n_normals);
    own.setIndices(mesh_schema::n_tangentIndices);
    own.add<base::vec4f, base::vec3f>(channels, mesh_schema::n_tangents);
    own.add<base::normal, base::vec3f>(channels, mesh_schema::n_bitangents);
    ChannelCollector(mesh, false).add<base::vec3f>(channels, mesh_schema::n_velocities);

    const u32 uvSetCount = getListCount(mesh, mesh_schema::n_uvSets);
    for (u32 i = 0; i < uvSetCount; ++i) {
        AttribMap* set = findListItem(mesh, mesh_schema::n_uvSets, i);
        if (!set)
            continue;
        ChannelCollector uv(*set);
        uv.setIndices(meshUVSet_schema::n_indices);
        uv.setInvalidIndex(find(*set, meshUVSet_schema::n_invalidIndex));
        uv.add<base::vec2f>(channels, meshUVSet_schema::n_UV);
        uv.add<base::vec3f>(channels, meshUVSet_schema::n_UVW);
        uv.add<base::vec4f>(channels, meshUVSet_schema::n_UVWQ);
    }
    const u32 colorSetCount = getListCount(mesh, mesh_schema::n_colorSets);
    for (u32 i = 0; i < colorSetCount; ++i) {
        AttribMap* set = findListItem(mesh, mesh_schema::n_colorSets, i);
        if (!set)
            continue;
        ChannelCollector color(*set);
        color.setIndices(meshColorSet_schema::n_indices);
        color.setInvalidIndex(find(*set, meshColorSet_schema::n_invalidIndex));
        color.add<float>(channels, meshColorSet_schema::n_A);
        color.add<base::vec3f>(channels, meshColorSet_schema::n_RGB);
        color.add<base::vec4f>(channels, meshColorSet_schema::n_RGBA);
    }
    return channels;
}

} // namespace scene
