#include "assimp/clip_tracks.h"

#include "assimp/library_text.h"

#include <assimp/scene.h>

#include <algorithm>

namespace assimp {

using base::string_view;
using base::TimeCode;
using base::u32;
using base::vector;

namespace {

/// Widens the range of a clip by keys. `isFirst` until there are some.
template <class T>
void include(const KeyTrack<T>& track, ClipTracks& clip, bool& isFirst) {
    if (track.isEmpty())
        return;
    clip.first = isFirst ? track.times.front() : std::min(clip.first, track.times.front());
    clip.last = isFirst ? track.times.back() : std::max(clip.last, track.times.back());
    isFirst = false;
}

void findRange(const aiAnimation& animation, const AnimationClock& clock, ClipTracks& clip) {
    bool isFirst = true;
    for (const auto& [node, motion] : std::as_const(clip.motions)) {
        include(motion.translation, clip, isFirst);
        include(motion.rotation, clip, isFirst);
        include(motion.scale, clip, isFirst);
    }
    for (const auto& [target, track] : std::as_const(clip.weights))
        include(track, clip, isFirst);
    clip.end = clip.last;
    if (TimeCode end; clock.read(animation.mDuration, end))
        clip.end = std::max(clip.end, end);
}

/// Sets `meshes` to those that a channel means: those of the node "n" for the "n*0" of FBX, where
/// the length of the text is wrong, else those with its name. Meshes without a morph object are
/// left out. False if there is no such node or mesh.
bool findMeshes(const aiString& text, NodeTable& nodes, const vector<MorphedMesh>& morphs,
                vector<u32>& meshes) {
    const char* end = std::find(text.data, std::end(text.data), '\0');
    const string_view name(text.data, static_cast<std::size_t>(end - text.data));
    if (const aiNode* node = nodes.find(name.substr(0, name.rfind('*'))))
        meshes.append(node->mMeshes, node->mMeshes + node->mNumMeshes);
    for (u32 i = 0; meshes.empty() && i < morphs.size(); ++i)
        if (morphs[i].meshName == name)
            meshes.push_back(i);
    const bool isFound = !meshes.empty();
    const auto isStiff = [&](u32 mesh) { return mesh >= morphs.size() || !morphs[mesh].morph; };
    const auto stiff = std::ranges::remove_if(meshes, isStiff);
    meshes.resize(meshes.size() - static_cast<std::size_t>(stiff.size()));
    return isFound;
}

} // namespace

ClipTracks readClip(const aiAnimation& animation, const AnimationClock& clock, NodeTable& nodes,
                    const vector<MorphedMesh>& morphs, AnimationFaults& faults) {
    ClipTracks clip;
    clip.name = viewOf(animation.mName);
    for (u32 i = 0; i < animation.mNumChannels; ++i) {
        const aiNodeAnim& channel = *animation.mChannels[i];
        const aiNode* node = nodes.find(viewOf(channel.mNodeName));
        if (!node)
            ++faults.unknownTargets;
        else if (clip.motions.contains(node))
            ++faults.repeatedChannels;
        else if (NodeMotion motion = readMotion(channel, clock, faults); !motion.isEmpty())
            clip.motions.emplace(node, std::move(motion));
    }
    for (u32 i = 0; i < animation.mNumMorphMeshChannels; ++i) {
        const aiMeshMorphAnim& channel = *animation.mMorphMeshChannels[i];
        vector<u32> meshes;
        faults.unknownTargets += !findMeshes(channel.mName, nodes, morphs, meshes);
        if (std::as_const(meshes).empty())
            continue;
        for (const auto& [number, track] : readWeights(channel, clock, faults))
            for (const u32 mesh : std::as_const(meshes)) {
                const vector<u32>& groups = morphs[mesh].groups;
                if (number >= groups.size())
                    ++faults.unknownTargets;
                else
                    faults.repeatedChannels +=
                        !clip.weights.try_emplace({mesh, groups[number]}, track).second;
            }
    }
    findRange(animation, clock, clip);
    return clip;
}

} // namespace assimp
