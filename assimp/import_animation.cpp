#include "assimp/import_animation.h"

#include "assimp/attribute_writing.h"
#include "assimp/clip_tracks.h"
#include "assimp/import_nodes.h"
#include "assimp/importer.h"
#include "assimp/layer_maker.h"
#include "assimp/library_text.h"

#include "scene_mesh.h"
#include "scene_options.h"
#include "scene_schema.h"

#include <assimp/scene.h>

#include <algorithm>

namespace assimp {

using base::AttribMap;
using base::IPlugin;
using base::string;
using base::TimeCode;
using base::u32;
using base::vector;
using scene::node_schema;

AnimationSettings::AnimationSettings(const AttribMap& importer) {
    using Schema = scene::sceneImporter_schema;
    animations = read(importer, Schema::n_importAnimations);
    everyFrame = read(importer, Schema::n_importBakedAnimations);
    const bool* first = importer.findAttribute<bool>(base::nameServer().id(firstAnimationSetting));
    firstOnly = first && *first;
}

bool isRootAnimated(const aiScene& source) {
    for (u32 i = 0; i < source.mNumAnimations; ++i)
        for (u32 c = 0; c < source.mAnimations[i]->mNumChannels; ++c)
            if (source.mAnimations[i]->mChannels[c]->mNodeName == source.mRootNode->mName)
                return true;
    return false;
}

namespace {

/// Brings the keys of all clips to nodes and morph targets.
class AnimationImport {
public:
    AnimationImport(const NodeTable& nodes, const vector<MorphedMesh>& morphs,
                    const vector<ClipTracks>& clips, FrameSampler& frames, LayerMaker& layer,
                    AnimationFaults& faults)
        : nodes_(nodes), morphs_(morphs), clips_(clips), frames_(frames), layer_(layer),
          faults_(faults) {}

    void run() {
        for (const NodeTable::MadeNode& node : nodes_.made())
            if (const vector<const aiNode*> chain = findChain(*node.source); !chain.empty())
                animateNode(*node.object, chain);
        animateMorphs();
    }

private:
    bool isMoved(const aiNode* node) const {
        const auto moves = [&](const ClipTracks& clip) { return clip.motions.contains(node); };
        return std::ranges::any_of(clips_, moves);
    }
    vector<const aiNode*> findChain(const aiNode& node) const;
    NodeMotion composeClip(const ClipTracks& clip, const vector<const aiNode*>& chain);
    void animateNode(IPlugin& node, const vector<const aiNode*>& chain);
    bool bake(const KeyTrack<float>& track, KeyTrack<float>& sampled);
    void animateMorphs();

    /// The tracks of one property in all clips; null where there are no keys.
    template <class T>
    static vector<const KeyTrack<T>*> select(const vector<NodeMotion>& motions,
                                             KeyTrack<T> NodeMotion::*property) {
        vector<const KeyTrack<T>*> tracks;
        for (const NodeMotion& motion : motions)
            tracks.push_back((motion.*property).isEmpty() ? nullptr : &(motion.*property));
        return tracks;
    }
    /// True if all clips hold one value, which `value`, at first that at rest, becomes.
    template <class T>
    static bool takeConstant(const vector<const KeyTrack<T>*>& tracks, T& value) {
        const T constant = tracks[0] ? tracks[0]->values[0] : value;
        for (const KeyTrack<T>* track : tracks)
            if (track ? !isConstant(*track, constant) : !areAlike(value, constant))
                return false;
        value = constant;
        return true;
    }

    const NodeTable& nodes_;
    const vector<MorphedMesh>& morphs_;
    const vector<ClipTracks>& clips_;
    FrameSampler& frames_;
    LayerMaker& layer_;
    AnimationFaults& faults_;
};

/// The nodes of the file that make up the transform of `node`, from the outermost; none if no clip
/// moves them.
vector<const aiNode*> AnimationImport::findChain(const aiNode& node) const {
    vector<const aiNode*> chain;
    for (const aiNode* factor = &node; factor; factor = nodes_.factorAbove(*factor))
        chain.push_back(factor);
    const auto moves = [&](const aiNode* factor) { return isMoved(factor); };
    if (std::ranges::none_of(std::as_const(chain), moves))
        return {};
    std::ranges::reverse(chain);
    return chain;
}

/// No motion if the clip moves nothing in the chain.
NodeMotion AnimationImport::composeClip(const ClipTracks& clip,
                                        const vector<const aiNode*>& chain) {
    vector<MotionFactor> factors;
    bool isMoved = false;
    for (const aiNode* node : chain) {
        const auto found = clip.motions.find(node);
        factors.push_back({readTransform(*node), nullptr});
        if (found == clip.motions.end())
            continue;
        factors.back().motion = &found->second;
        isMoved = true;
    }
    return isMoved ? composeMotion(factors, frames_, faults_.shearedNodes) : NodeMotion();
}

void AnimationImport::animateNode(IPlugin& node, const vector<const aiNode*>& chain) {
    vector<NodeMotion> motions;
    for (const ClipTracks& clip : clips_)
        motions.push_back(composeClip(clip, chain));
    const auto translations = select(motions, &NodeMotion::translation);
    const auto rotations = select(motions, &NodeMotion::rotation);
    const auto scales = select(motions, &NodeMotion::scale);

    const base::vec3d restTranslation = read(node, node_schema::n_translate);
    const base::quatf restRotation = read(node, node_schema::n_rotate);
    const base::vec3f restScale = read(node, node_schema::n_scale);
    base::vec3d translation = restTranslation;
    base::quatf rotation = restRotation;
    base::vec3f scale = restScale;
    const bool standsStill = takeConstant(translations, translation);
    const bool keepsRotation = takeConstant(rotations, rotation);
    const bool keepsScale = takeConstant(scales, scale);
    const bool isAsAtRest = areAlike(translation, restTranslation) &&
                            areAlike(rotation, restRotation) && areAlike(scale, restScale);
    if (standsStill && keepsRotation && keepsScale && isAsAtRest)
        return; // and keeps its shear

    // Shear would not go with the values of the channels.
    node.removeAttribute(node_schema::n_shear);
    writeUnlessDefault(node, node_schema::n_translate, translation);
    writeUnlessDefault(node, node_schema::n_rotate, rotation);
    writeUnlessDefault(node, node_schema::n_scale, scale);
    const string name = node.getName();
    if (!standsStill)
        layer_.animate(node, node_schema::n_translate, name + ".translate", translations,
                       translation);
    if (!keepsRotation)
        layer_.animate(node, node_schema::n_rotate, name + ".rotate", rotations, rotation);
    if (!keepsScale)
        layer_.animate(node, node_schema::n_scale, name + ".scale", scales, scale);
}

/// Sets `sampled` to `track` with a key on every frame. False if that is not wanted or not
/// possible.
bool AnimationImport::bake(const KeyTrack<float>& track, KeyTrack<float>& sampled) {
    if (!frames_.everyFrame() || track.values.size() < 2)
        return false;
    const vector<TimeCode> frames = frames_.listFrames(track.times.front(), track.times.back(), 1);
    if (frames.empty())
        return false;
    sampled = resample(track, frames);
    return true;
}

void AnimationImport::animateMorphs() {
    using Item = scene::morphTarget_schema;
    base::map<std::pair<u32, u32>, vector<const KeyTrack<float>*>> targets;
    for (std::size_t i = 0; i < clips_.size(); ++i)
        for (const auto& [target, track] : clips_[i].weights) {
            auto& tracks = targets[target];
            tracks.resize(clips_.size());
            tracks[i] = &track;
        }
    for (auto& [target, tracks] : targets) {
        AttribMap* item = findListItem(*morphs_[target.first].morph, scene::morph_schema::n_targets,
                                       target.second);
        vector<KeyTrack<float>> sampled(tracks.size());
        for (std::size_t i = 0; i < tracks.size(); ++i)
            if (tracks[i] && bake(*tracks[i], sampled[i]))
                tracks[i] = &sampled[i];
        float& weight = write(*item, Item::n_weight);
        const float rest = weight;
        const IPlugin* mesh = findObject(*item, Item::n_targetMesh);
        if (!takeConstant(tracks, weight))
            layer_.animate(*item, Item::n_weight, mesh->getName() + ".weight", tracks, rest);
    }
}

/// The animations that are wanted.
vector<const aiAnimation*> listAnimations(const aiScene& source,
                                          const AnimationSettings& settings) {
    const u32 count =
        settings.firstOnly ? std::min(source.mNumAnimations, 1u) : source.mNumAnimations;
    return {source.mAnimations, source.mAnimations + count};
}

/// Those that have keys, as many as fit one after the other into a span of time.
vector<ClipTracks> readClips(const vector<const aiAnimation*>& animations, u32 framesPerSecond,
                             NodeTable& nodes, const vector<MorphedMesh>& morphs,
                             AnimationFaults& faults) {
    constexpr double longestSpan = 1e8; // seconds, half of what a time can tell
    vector<ClipTracks> clips;
    double span = 0;
    for (const aiAnimation* animation : animations) {
        const AnimationClock clock(*animation, framesPerSecond);
        ClipTracks clip = readClip(*animation, clock, nodes, morphs, faults);
        span += clip.last.seconds() - clip.first.seconds() + 1;
        if (clip.isEmpty())
            ++faults.emptyAnimations;
        else if (span > longestSpan)
            ++faults.lateAnimations;
        else
            clips.push_back(std::move(clip));
    }
    return clips;
}

} // namespace

void importAnimations(const aiScene& source, const AnimationSettings& settings, NodeTable& nodes,
                      const vector<MorphedMesh>& morphs, IPlugin& scene,
                      base::PluginFactory& factory, const string& path) {
    if (!settings.animations || source.mNumAnimations == 0)
        return;
    const vector<const aiAnimation*> animations = listAnimations(source, settings);
    const u32 framesPerSecond = findFrameRate(animations);
    AnimationFaults faults;
    const vector<ClipTracks> clips = readClips(animations, framesPerSecond, nodes, morphs, faults);
    if (!clips.empty()) {
        FrameSampler frames(TimeCode::ticksPerSecond / framesPerSecond, settings.everyFrame);
        LayerMaker layer(clips, factory);
        AnimationImport(nodes, morphs, clips, frames, layer, faults).run();
        faults.longMotions = frames.longMotions();
        layer.finish(scene, framesPerSecond);
    }
    faults.report(path);
}

} // namespace assimp
