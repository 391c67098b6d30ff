#include "gltf/image_uris.h"

#include "b_log.h"
#include "b_string_convert.h"
#include "stream/b_fs.h"

namespace gltf {

using base::string;
using base::string_view;
using GLTF::Image;

namespace {

bool haveEqualData(const Image& a, const Image& b) {
    return a.byteLength == b.byteLength &&
           std::memcmp(a.data, b.data, static_cast<std::size_t>(a.byteLength)) == 0;
}

/// `uri` with `number` behind its name: "a.png" becomes "a_2.png".
string numbered(const string& uri, int number) {
    const string extension = base::fs::extension(uri);
    const std::size_t nameLength = uri.size() - (extension.empty() ? 0 : extension.size() + 1);
    return uri.substr(0, nameLength) + "_" + std::to_string(number) + uri.substr(nameLength);
}

/// Which files are taken, and by the data of which image.
class TakenFiles {
public:
    TakenFiles(const string& folder, const SourceFiles& sources)
        : folder_(folder), current_(base::fs::master().curdir()), sources_(sources) {}

    void addOutput(const string& path) { files_.try_emplace(keyOf(path), nullptr); }
    /// True if the file of that uri is free for the image or holds the same data; it is taken
    /// then.
    bool take(const string& uri, const Image& image) {
        const string path = folder_ + uri;
        if (const auto known = files_.find(keyOf(path)); known != files_.end())
            return known->second && haveEqualData(*known->second, image);
        if (sources_.contains(path) && !isSameFile(path, image.cacheKey))
            return false;
        files_[keyOf(path)] = &image;
        return true;
    }

private:
    /// One text for all ways to name a file.
    string keyOf(const string& path) const {
        const string resolved = base::fs::master().resolve(path);
        return base::toLower(base::fs::normalized(base::fs::joined(current_, resolved)));
    }

    string folder_;
    string current_;
    const SourceFiles& sources_;
    base::map<string, const Image*> files_; ///< null for what is no image
};

/// The images that wanted one uri which another one has.
class Namesakes {
public:
    /// A uri for the image: that of one with the same data, else the next free one.
    string place(const Image& image, TakenFiles& taken) {
        const auto* bytes = reinterpret_cast<const char*>(image.data);
        const std::size_t hash = std::hash<string_view>()(
            string_view(bytes, static_cast<std::size_t>(image.byteLength)));
        for (const auto& [other, uri] : placed_[hash]) {
            if (haveEqualData(*other, image))
                return uri;
        }
        string uri;
        do
            uri = numbered(image.uri, next_++);
        while (!taken.take(uri, image));
        placed_[hash].push_back({&image, uri});
        return uri;
    }

private:
    int next_ = 2;
    base::hash_map<std::size_t, base::vector<std::pair<const Image*, string>>> placed_;
};

} // namespace

void makeUrisUnique(const base::vector<Image*>& images, const SourceFiles& sources,
                    const base::vector<string>& otherOutputs, const string& folder) {
    TakenFiles taken(folder, sources);
    for (const string& path : otherOutputs)
        taken.addOutput(path);
    base::map<string, Namesakes> namesakes;
    for (Image* image : images) {
        if (!image->data || taken.take(image->uri, *image))
            continue;
        const string uri = image->uri;
        image->uri = namesakes[base::toLower(uri)].place(*image, taken);
        base::log().log(base::logScene, base::logWarning,
                        "gltf |{}| Another image is called so, the file is written as '{}'!", uri,
                        image->uri);
    }
}

} // namespace gltf
