#include "i_cubemap.h"

#include "i_file.h"

#include "b_log.h"
#include "stream/b_fs.h"

#include <algorithm>
#include <array>
#include <cstring>
#include <optional>
#include <tuple>

namespace iio {

namespace {

using Faces = std::array<const Image*, 6>;

bool hasPicture(const Image* face) {
    return face && face->hasPixels() && face->kind() == Image::kind2D;
}

auto layoutOf(const Image& image) {
    return std::tuple(image.width(), image.height(), image.format(), image.type(),
                      image.byteAlignment());
}

/// What keeps `faces` from being one cube; null if nothing does.
const char* findMismatch(const Faces& faces) {
    const Image* first = faces[0];
    const auto differs = [&](auto property) {
        return std::ranges::any_of(
            faces, [&](const Image* face) { return property(*face) != property(*first); });
    };
    if (!std::ranges::all_of(faces, hasPicture))
        return "one or more image is invalid (could be nullptr, not allocated, not 2D,wrong "
               "internal configuration, etc).";
    if (first->width() != first->height())
        return "all the images must be square.";
    if (differs([](const Image& face) { return std::pair(face.width(), face.height()); }))
        return "the faces of the cube must have the very same dimensions.";
    if (differs([](const Image& face) { return face.format(); }))
        return "the faces of the cube must have the very same format.";
    if (differs([](const Image& face) { return face.type(); }))
        return "the faces of the cube must have the very same type.";
    if (differs([](const Image& face) { return face.byteAlignment(); }))
        return "the faces of the cube must have the very same byte alignment.";
    if (differs([](const Image& face) { return face.memorySize(); }))
        return "the faces of the cube must require the very same amount of memory.";
    return nullptr;
}

/// Makes `cube` of faces that fit together. False where its pixels could not be allocated.
bool copyFaces(const Faces& faces, Image& cube) {
    const Image& first = *faces[0];
    cube.createCube(first.width(), first.height(), first.byteAlignment(), first.format(),
                    first.type());
    if (!cube.data())
        return false;
    for (u32 n = 0; n < 6; ++n)
        std::memcpy(cube.face(n), faces[n]->data(), first.memorySize());
    return true;
}

/// The names of the faces in the order of a cube map. The alternatives of a word stand behind it.
struct MarkerSet {
    std::array<const char*, 6> words;
    std::array<const char*, 6> alternatives{};
};

constexpr MarkerSet markerSets[] = {
    {{"posx", "negx", "posy", "negy", "posz", "negz"}},
    {{"xpos", "xneg", "ypos", "yneg", "zpos", "zneg"}},
    {{"right", "left", "top", "bottom", "front", "back"},
     {nullptr, nullptr, "up", "down", "forward", nullptr}},
    {{"_rt.", "_lf.", "_up.", "_dn.", "_ft.", "_bk."}},
    {{"px.", "nx.", "py.", "ny.", "pz.", "nz."}},
};

struct Marker {
    const MarkerSet* set;
    std::size_t position; ///< in the file name
    std::size_t length;
};

/// The last place in `name` of a word of `set`.
std::optional<Marker> findLast(const MarkerSet& set, const string& name) {
    std::optional<Marker> last;
    for (const auto words : {&MarkerSet::words, &MarkerSet::alternatives}) {
        for (const char* word : set.*words) {
            const auto position = word ? name.rfind(word) : string::npos;
            if (position != string::npos && (!last || position > last->position))
                last = Marker{&set, position, std::strlen(word)};
        }
    }
    return last;
}

string withWord(const Marker& marker, const char* word, string name) {
    return name.replace(marker.position, marker.length, word);
}

/// The file of face `n`, named as `name` but for the marker; empty if `files` hold none.
string findFace(const Marker& marker, u32 n, const string& name, const vector<string>& files) {
    for (const char* word : {marker.set->words[n], marker.set->alternatives[n]}) {
        if (!word)
            continue;
        const string wanted = withWord(marker, word, name);
        if (std::ranges::find(files, wanted) != files.end())
            return wanted;
    }
    return {};
}

ref<Image> loadFaces(const string& folder, const std::array<string, 6>& names) {
    std::array<ref<Image>, 6> faces;
    std::ranges::transform(names, faces.begin(),
                           [&](const string& name) { return loadImage(folder + name); });
    return createCubemap(faces[0], faces[1], faces[2], faces[3], faces[4], faces[5]);
}

} // namespace

ref<Image> createCubemap(const ref<Image>& posX, const ref<Image>& negX, const ref<Image>& posY,
                         const ref<Image>& negY, const ref<Image>& posZ, const ref<Image>& negZ) {
    const Faces faces = {posX.get(), negX.get(), posY.get(), negY.get(), posZ.get(), negZ.get()};
    if (const char* mismatch = findMismatch(faces)) {
        base::log().log(base::logIO, base::logError, "Cubemap creation failed: {}", mismatch);
        return {};
    }
    auto cube = base::makeRef<Image>();
    if (!copyFaces(faces, *cube))
        return {};
    cube->info = posX->info;
    cube->setPath(posX->path());
    for (u32 level = 1; level <= posX->levelCount(); ++level) {
        Faces levels;
        std::ranges::transform(faces, levels.begin(),
                               [&](const Image* face) { return face->level(level); });
        // Compressed levels of one block are not two-dimensional any more, so less is asked for.
        const bool areAlike = std::ranges::all_of(levels, [&](const Image* face) {
            return face && levels[0] && face->hasPixels() && !face->isCube() &&
                   face->depth() == 1 && layoutOf(*face) == layoutOf(*levels[0]);
        });
        if (areAlike)
            copyFaces(levels, *cube->level(level, true));
    }
    return cube;
}

ref<Image> loadCubemap(const string& path) {
    const string folder = base::fs::folder(path), name = base::fs::fileName(path);
    const vector<string> files = base::fs::master().findFiles(folder, "*");
    // A name may hold a word of one set by chance and be marked by another one, so that the first
    // set with all six files counts.
    vector<string> missing; ///< of the first set
    for (const MarkerSet& set : markerSets) {
        const std::optional<Marker> marker = findLast(set, name);
        if (!marker)
            continue;
        std::array<string, 6> faces;
        vector<string> missingHere;
        for (u32 n = 0; n < 6; ++n) {
            faces[n] = findFace(*marker, n, name, files);
            if (faces[n].empty())
                missingHere.push_back(withWord(*marker, set.words[n], name));
        }
        if (missingHere.empty())
            return loadFaces(folder, faces);
        if (missing.empty())
            missing.swap(missingHere);
    }
    if (missing.empty())
        base::log().log(base::logIO, base::logInformation, "Unrecognized cubemap format '{}'!",
                        path);
    for (const string& face : missing)
        base::log().log(base::logIO, base::logInformation, "Cubemap subimage '{}' not found!",
                        folder + face);
    return {};
}

} // namespace iio
