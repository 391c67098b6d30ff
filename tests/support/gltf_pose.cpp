#include "gltf_pose.h"

#include <cstring>
#include <set>

namespace test_support {

namespace {

using rapidjson::Value;

const Value& requireMember(const Value& object, const char* name) {
    const auto found = object.FindMember(name);
    if (found == object.MemberEnd()) {
        throw GltfError(std::string("no member ") + name);
    }
    return found->value;
}

size_t requireIndex(const Value& object, const char* name) {
    const Value& member = requireMember(object, name);
    if (!member.IsUint()) {
        throw GltfError(std::string(name) + " is no index");
    }
    return member.GetUint();
}

/// The values of a channel at a time: `size` numbers, linear between keys, a rotation on a sphere.
std::vector<double> evaluate(const AnimationChannel& channel, size_t size, double seconds) {
    const std::vector<double>& times = channel.times;
    const std::vector<double>& values = channel.values.values;
    if (times.empty() || values.size() != times.size() * size) {
        throw GltfError("an animation sampler of unequal lengths");
    }
    const auto after = std::upper_bound(times.begin(), times.end(), seconds);
    const auto next = static_cast<size_t>(after - times.begin());
    const double* b = values.data() + std::min(next, times.size() - 1) * size;
    const double* a = next == 0 ? b : values.data() + (next - 1) * size;
    const bool isBetween = next > 0 && next < times.size();
    const double u = isBetween ? (seconds - times[next - 1]) / (times[next] - times[next - 1]) : 0;
    std::vector<double> result(a, a + size);
    if (channel.path == "rotation") {
        const Quaternion turned = slerp({a[0], a[1], a[2], a[3]}, {b[0], b[1], b[2], b[3]}, u);
        return {turned.begin(), turned.end()};
    }
    for (size_t i = 0; i < size; ++i) {
        result[i] += u * (b[i] - a[i]);
    }
    return result;
}

size_t targetCount(const GltfFile& file, size_t mesh) {
    const Value& primitive = file.element("meshes", mesh)["primitives"][0];
    const auto found = primitive.FindMember("targets");
    return found == primitive.MemberEnd() ? 0 : found->value.Size();
}

Placement placementOf(const Value& node) {
    Placement placement;
    const auto load = [&](const char* name, auto& numbers) {
        const auto found = node.FindMember(name);
        for (size_t i = 0; found != node.MemberEnd() && i < numbers.size(); ++i) {
            numbers[i] = found->value[static_cast<rapidjson::SizeType>(i)].GetDouble();
        }
    };
    load("translation", placement.translation);
    load("rotation", placement.rotation);
    load("scale", placement.scale);
    return placement;
}

void addScaled(Vector& sum, const Vector& v, double factor) {
    for (size_t axis = 0; axis < 3; ++axis) {
        sum[axis] += factor * v[axis];
    }
}

Vector vectorAt(const AccessorValues& values, size_t index) {
    const double* p = values.at(index);
    return {p[0], p[1], p[2]};
}

} // namespace

std::vector<AnimationChannel> animationChannels(const GltfFile& file) {
    std::vector<AnimationChannel> result;
    if (file.count("animations") == 0) {
        return result;
    }
    const Value& animation = file.element("animations", 0);
    const Value& samplers = requireMember(animation, "samplers");
    for (const Value& object : requireMember(animation, "channels").GetArray()) {
        const size_t index = requireIndex(object, "sampler");
        if (index >= samplers.Size()) {
            throw GltfError("a channel without a sampler");
        }
        const Value& sampler = samplers[static_cast<rapidjson::SizeType>(index)];
        const auto interpolation = sampler.FindMember("interpolation");
        if (interpolation != sampler.MemberEnd() &&
            std::strcmp(interpolation->value.GetString(), "LINEAR") != 0) {
            throw GltfError("an interpolation that is not linear");
        }
        const Value& target = requireMember(object, "target");
        const size_t input = requireIndex(sampler, "input");
        result.push_back({requireIndex(target, "node"), requireMember(target, "path").GetString(),
                          static_cast<int>(input), file.accessor(input).values,
                          file.accessor(requireIndex(sampler, "output"))});
    }
    return result;
}

std::vector<double> keyTimes(const GltfFile& file) {
    std::set<double> times;
    for (const AnimationChannel& channel : animationChannels(file)) {
        times.insert(channel.times.begin(), channel.times.end());
    }
    return {times.begin(), times.end()};
}

GltfPose::GltfPose(const GltfFile& file, double seconds)
    : file_(file), isPlaced_(file.count("nodes")), weights_(file.count("nodes")),
      worldFromNode_(file.count("nodes"), toMatrix(Placement{})) {
    std::vector<Placement> placements;
    for (size_t i = 0; i < file.count("nodes"); ++i) {
        placements.push_back(placementOf(file.element("nodes", i)));
    }
    applyAnimation(placements, seconds);
    std::vector<Matrix> locals = file.localMatrices();
    for (size_t i = 0; i < locals.size(); ++i) {
        if (isPlaced_[i]) {
            locals[i] = toMatrix(placements[i]);
        }
    }
    instances_ = file.instances(locals);
    for (const NodeInstance& instance : instances_) {
        worldFromNode_[instance.node] = instance.worldFromNode;
    }
}

void GltfPose::applyAnimation(std::vector<Placement>& placements, double seconds) {
    for (const AnimationChannel& channel : animationChannels(file_)) {
        const size_t node = channel.node;
        const std::string& path = channel.path;
        const size_t size =
            path == "rotation" ? 4
            : path != "weights"
                ? 3
                : targetCount(file_, requireIndex(file_.element("nodes", node), "mesh"));
        const std::vector<double> values = evaluate(channel, size, seconds);
        if (path == "weights") {
            weights_.at(node) = values;
            continue;
        }
        isPlaced_.at(node) = true;
        Placement& placement = placements.at(node);
        if (path == "translation") {
            placement.translation = {values[0], values[1], values[2]};
        } else if (path == "rotation") {
            placement.rotation = {values[0], values[1], values[2], values[3]};
        } else {
            placement.scale = {values[0], values[1], values[2]};
        }
    }
}

std::vector<double> GltfPose::weights(const NodeInstance& instance) const {
    const auto mesh = static_cast<size_t>(instance.mesh);
    std::vector<double> result = weights_.at(instance.node);
    if (!result.empty()) {
        return result;
    }
    result.assign(targetCount(file_, mesh), 0);
    const Value& object = file_.element("meshes", mesh);
    const auto stored = object.FindMember("weights");
    for (size_t i = 0; stored != object.MemberEnd() && i < result.size(); ++i) {
        result[i] = stored->value[static_cast<rapidjson::SizeType>(i)].GetDouble();
    }
    return result;
}

/// What each joint of a skin does to the vertices of a mesh, in the world.
std::vector<Matrix> GltfPose::jointMatrices(size_t skin) const {
    const Value& object = file_.element("skins", skin);
    const Value& joints = requireMember(object, "joints");
    const AccessorValues inverses = file_.accessor(requireIndex(object, "inverseBindMatrices"));
    if (inverses.components != 16 || inverses.count < joints.Size()) {
        throw GltfError("a skin with fewer inverse bind matrices than joints");
    }
    std::vector<Matrix> result;
    for (rapidjson::SizeType i = 0; i < joints.Size(); ++i) {
        Matrix inverse;
        std::copy_n(inverses.at(i), 16, inverse.begin());
        result.push_back(worldFromNode(joints[i].GetUint()) * inverse);
    }
    return result;
}

std::vector<Vector> GltfPose::positions(const NodeInstance& instance,
                                        const Primitive& primitive) const {
    const AccessorValues& stored = primitive.attributes.at("POSITION");
    const std::vector<double> factors = weights(instance);
    const Value& node = file_.element("nodes", instance.node);
    const bool isSkinned = node.HasMember("skin");
    const std::vector<Matrix> joints =
        isSkinned ? jointMatrices(requireIndex(node, "skin")) : std::vector<Matrix>();
    std::vector<Vector> result;
    for (size_t v = 0; v < stored.count; ++v) {
        Vector position = vectorAt(stored, v);
        for (size_t t = 0; t < primitive.targets.size(); ++t) {
            addScaled(position, vectorAt(primitive.targets[t].at("POSITION"), v), factors.at(t));
        }
        if (!isSkinned) {
            result.push_back(transformPoint(instance.worldFromNode, position));
            continue;
        }
        Vector sum{};
        for (size_t j = 0; j < 4; ++j) {
            const auto joint = static_cast<size_t>(primitive.attributes.at("JOINTS_0").at(v)[j]);
            addScaled(sum, transformPoint(joints.at(joint), position),
                      primitive.attributes.at("WEIGHTS_0").at(v)[j]);
        }
        result.push_back(sum);
    }
    return result;
}

} // namespace test_support
