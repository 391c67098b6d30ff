#include "gltf/exporter.h"
#include "gltf/scene_kind.h"

#include "b_log.h"
#include "scene_animation.h"
#include "scene_mesh.h"
#include "scene_schema.h"

#include <cmath>

namespace gltf {

using base::AttribMap;
using base::ref;
using base::TimeCode;
using base::u32;
using base::vector;
using scene::morph_schema;
using scene::morphTarget_schema;

namespace {

constexpr u32 weightFault = 1, sharedFault = 2;
constexpr const char* weightText =
    "gltf |{}| The morph has weights that are not finite, they count as 0!";

/// The weight of a target as a float. One that is not finite counts as 0.
float readWeight(const AttribMap& target, bool& isRepaired) {
    const auto weight = static_cast<float>(readReal(target, morphTarget_schema::n_weight));
    if (std::isfinite(weight))
        return weight;
    isRepaired = true;
    return morphTarget_schema::n_weight.defaultValue;
}

/// The times of the keys of all weights that count.
vector<TimeCode> findKeyTimes(const scene::IMorph& morph, const vector<u32>& targets) {
    vector<TimeCode> times;
    for (const u32 index : targets)
        scene::mergeKeyTimes(findListItem(morph, morph_schema::n_targets, index)
                                 ->findAttribute(morphTarget_schema::n_weight, false),
                             times);
    return times;
}

} // namespace

void GLTFScenePlugin::convertMorphChild(GLTF::Node& gltfNode, base::IPlugin& child,
                                        u32 materialIndex) {
    const auto* morph = findClass<const scene::IMorph>(child);
    scene::IMesh* baseMesh = morph ? findMesh(*morph, morph_schema::n_baseMesh) : nullptr;
    if (!baseMesh)
        return;
    if (!exportAnimations) {
        // The shape that the scene has now stands for the morph.
        if (scene::IMesh* shape = findMesh(*morph, morph_schema::n_outMesh)) {
            if (ref<GLTF::Mesh> gltfMesh = convertMesh(*shape, materialIndex, false))
                attachMesh(gltfNode, std::move(gltfMesh));
            return;
        }
    }
    GLTF::Node* holder = convertMeshChild(gltfNode, *baseMesh, materialIndex, true);
    if (!holder || morph->hasFlag(base::attribNoTargets))
        return;
    const auto [targets, isNew] = morphTargets_.try_emplace(morph);
    if (isNew)
        targets->second = addTargets(*holder->mesh, *morph, *baseMesh);
    if (exportAnimations)
        makeMorphAnimation(*morph, *holder, targets->second);
}

/// Adds the targets of `morph` and their weights to the mesh. Returns the places of those that
/// count: that have a mesh which fits the base.
vector<u32> GLTFScenePlugin::addTargets(GLTF::Mesh& gltfMesh, const scene::IMorph& morph,
                                        const scene::IMesh& baseMesh) {
    constexpr base::u8 wholeShapes = 1;
    const bool isWholeShape = scene::read(morph, morph_schema::n_method) == wholeShapes;
    const bool isShared = !gltfMesh.weights.empty();
    bool isRepaired = false;
    vector<u32> targets;
    const u32 count = getListCount(morph, morph_schema::n_targets);
    for (u32 i = 0; i < count; ++i) {
        const AttribMap* target = findListItem(morph, morph_schema::n_targets, i);
        const scene::IMesh* targetMesh =
            target ? findMesh(*target, morphTarget_schema::n_targetMesh) : nullptr;
        if (!targetMesh || !convertMorphTarget(gltfMesh, *targetMesh, baseMesh, isWholeShape))
            continue;
        gltfMesh.weights.push_back(readWeight(*target, isRepaired));
        targets.push_back(i);
    }
    if (isRepaired)
        warnOnce(morph, weightFault, weightText);
    if (isShared && !targets.empty())
        warnOnce(morph, sharedFault,
                 "gltf |{}| The mesh has the targets of another morph already, these are added to "
                 "them!");
    return targets;
}

void GLTFScenePlugin::makeMorphAnimation(const scene::IMorph& morph, GLTF::Node& holder,
                                         const vector<u32>& targets) {
    const vector<TimeCode> times = findKeyTimes(morph, targets);
    if (times.empty())
        return;
    MorphAnimation& entry = morphAnimations.emplace_back();
    entry.animation = base::makeRef<GLTF::Animation>();
    entry.start = times.front();
    entry.end = times.back();
    entry.morph = &morph;
    entry.targets = targets;
    addChannel(*entry.animation, holder, GLTF::Animation::Channel::weights);
}

void GLTFScenePlugin::sampleMorphAnimation(MorphAnimation& entry, TimeCode time) {
    if (time < entry.start || time > entry.end)
        return;
    bool isRepaired = false;
    for (const u32 index : entry.targets) {
        const AttribMap* target = findListItem(*entry.morph, morph_schema::n_targets, index);
        entry.weights.push_back(target ? readWeight(*target, isRepaired) : 0);
    }
    if (isRepaired)
        warnOnce(*entry.morph, weightFault, weightText);
}

} // namespace gltf
