#include "gltf_faults.h"

#include "gltf_statistics.h"

#include <algorithm>
#include <cmath>
#include <sstream>

namespace test_support {

namespace {

using rapidjson::Value;

/// The format compares limits after rounding them to the type of the values.
double limitOf(const Value& limit, int componentType) {
    return componentType == 5126 ? static_cast<double>(limit.GetFloat()) : limit.GetDouble();
}

class FaultFinder {
public:
    explicit FaultFinder(const GltfFile& file) : file_(file) {}

    std::vector<Fault> run() {
        for (unsigned i = 0; i < file_.count("accessors"); ++i) {
            if (file_.element("accessors", i).HasMember("bufferView")) {
                checkAlignment(i);
                checkValues(i, file_.accessor(i), 0);
            }
        }
        for (size_t mesh = 0; mesh < file_.count("meshes"); ++mesh) {
            const Value& primitives = file_.element("meshes", mesh)["primitives"];
            for (rapidjson::SizeType i = 0; i < primitives.Size(); ++i) {
                const Primitive primitive = file_.primitive(mesh, i);
                if (primitive.compressed) {
                    checkCompressed(primitives[i], primitive);
                }
            }
        }
        for (unsigned i = 0; i < file_.count("images"); ++i) {
            checkImage(i);
        }
        for (unsigned i = 0; i < file_.count("animations"); ++i) {
            for (const Value& sampler : file_.element("animations", i)["samplers"].GetArray()) {
                checkKeyTimes(sampler["input"].GetUint());
            }
        }
        for (unsigned i = 0; i < file_.count("nodes"); ++i) {
            checkSkin(i);
        }
        return std::move(faults_);
    }

private:
    void add(const char* kind, const char* array, unsigned index, const std::string& text) {
        faults_.push_back(
            {kind, std::string("/") + array + "/" + std::to_string(index) + ": " + text});
    }

    void checkAlignment(unsigned index) {
        const Value& accessor = file_.element("accessors", index);
        const Value& view = file_.element("bufferViews", accessor["bufferView"].GetUint());
        const auto offsetOf = [](const Value& object) {
            return object.HasMember("byteOffset") ? object["byteOffset"].GetUint() : 0;
        };
        const int type = accessor["componentType"].GetInt();
        const unsigned size = type >= 5125 ? 4 : type >= 5122 ? 2 : 1;
        if ((offsetOf(accessor) + offsetOf(view)) % size != 0) {
            add("alignment", "accessors", index, "starts in the middle of a component");
        }
    }

    /// Limits may lie `tolerance` off.
    void checkValues(unsigned index, const AccessorValues& values, double tolerance) {
        const Value& accessor = file_.element("accessors", index);
        const auto isFinite = [](double value) { return std::isfinite(value); };
        if (!std::all_of(values.values.begin(), values.values.end(), isFinite)) {
            add("not-finite", "accessors", index, "has values that are not finite");
            return;
        }
        if (!accessor.HasMember("min") || !accessor.HasMember("max") || values.count == 0) {
            return;
        }
        for (rapidjson::SizeType c = 0; c < values.components; ++c) {
            double least = values.at(0)[c];
            double largest = least;
            for (size_t i = 1; i < values.count; ++i) {
                least = std::min(least, values.at(i)[c]);
                largest = std::max(largest, values.at(i)[c]);
            }
            const double min = limitOf(accessor["min"][c], values.componentType);
            const double max = limitOf(accessor["max"][c], values.componentType);
            if (!(std::abs(min - least) <= tolerance && std::abs(max - largest) <= tolerance)) {
                std::ostringstream text;
                text.precision(9);
                text << "declared " << min << ".." << max << ", found " << least << ".." << largest;
                add("limits", "accessors", index, text.str());
            }
        }
    }

    void checkCount(unsigned index, size_t found) {
        const unsigned declared = file_.element("accessors", index)["count"].GetUint();
        if (declared != found) {
            add("draco-count", "accessors", index,
                "declared " + std::to_string(declared) + " elements, the stream has " +
                    std::to_string(found));
        }
    }

    void checkCompressed(const Value& object, const Primitive& primitive) {
        const double step = positionStep(file_, object);
        for (const auto& [name, values] : primitive.attributes) {
            const unsigned index = object["attributes"][name.c_str()].GetUint();
            checkCount(index, values.count);
            checkValues(index, values, name == "POSITION" ? step : HUGE_VAL);
        }
        if (object.HasMember("indices")) {
            checkCount(object["indices"].GetUint(), primitive.indices.size());
        }
    }

    void checkKeyTimes(unsigned index) {
        const std::vector<double> times = file_.accessor(index).values;
        const auto notAbove = [](double a, double b) { return a >= b; };
        if (std::adjacent_find(times.begin(), times.end(), notAbove) != times.end()) {
            add("key-times", "accessors", index, "has times that do not rise");
        }
    }

    /// The joints that the vertices of a node's mesh name are those of the node's skin.
    void checkSkin(unsigned index) {
        const Value& node = file_.element("nodes", index);
        if (!node.HasMember("skin") || !node.HasMember("mesh")) {
            return;
        }
        const auto joints = file_.element("skins", node["skin"].GetUint())["joints"].Size();
        const unsigned mesh = node["mesh"].GetUint();
        const auto primitives = file_.element("meshes", mesh)["primitives"].Size();
        for (rapidjson::SizeType i = 0; i < primitives; ++i) {
            const std::vector<double> named =
                file_.primitive(mesh, i).attributes["JOINTS_0"].values;
            if (named.empty() || *std::max_element(named.begin(), named.end()) >= joints) {
                add("joints", "nodes", index, "has a skin without joints that its vertices name");
            }
        }
    }

    void checkImage(unsigned index) {
        const Value& image = file_.element("images", index);
        try {
            const bool empty =
                image.HasMember("uri")
                    ? readUri({image["uri"].GetString(), image["uri"].GetStringLength()},
                              file_.folder())
                          .empty()
                    : file_.bufferView(image["bufferView"].GetUint()).empty();
            if (empty) {
                add("image", "images", index, "is empty");
            }
        } catch (const GltfError& error) {
            add("image", "images", index, error.what());
        }
    }

    const GltfFile& file_;
    std::vector<Fault> faults_;
};

} // namespace

std::vector<Fault> findFaults(const GltfFile& file) {
    return FaultFinder(file).run();
}

} // namespace test_support
