#include "assimp/texture_search.h"

#include "b_string_convert.h"
#include "stream/b_fs.h"

#include <algorithm>
#include <charconv>
#include <filesystem>

namespace assimp {

namespace fs = base::fs;
using base::string;
using base::string_view;
using base::vector;

namespace {

/// Where textures are kept, as seen from the folder of a model.
constexpr const char* usualFolders[] = {"",
                                        "textures",
                                        "Textures",
                                        "images",
                                        "maps",
                                        "tex",
                                        "materials/textures",
                                        "../textures",
                                        "../Textures",
                                        "../images",
                                        "../maps",
                                        "../tex",
                                        "../materials/textures"};

bool isRegularFile(const string& path) {
    std::error_code error;
    return std::filesystem::is_regular_file(fs::master().resolve(path), error);
}

/// The path without what stands around it in some files: blanks, quotation marks, "file://".
/// Folders are separated by slashes.
string cleaned(string_view path) {
    path = base::trimmed(path.substr(0, path.find('\0')));
    if (path.size() >= 2 && path.front() == '"' && path.back() == '"')
        path = base::trimmed(path.substr(1, path.size() - 2));
    constexpr string_view scheme = "file://";
    if (path.starts_with(scheme))
        path.remove_prefix(scheme.size());
    return fs::normalized(path);
}

/// The text with "%" and two hexadecimal digits replaced by the byte that they stand for; never
/// by the zero byte, which ends a path.
string unescaped(string_view text) {
    string result;
    for (std::size_t i = 0; i < text.size(); ++i) {
        unsigned byte = 0;
        const char* digits = text.data() + i + 1;
        if (text[i] == '%' && text.size() - i > 2 &&
            std::from_chars(digits, digits + 2, byte, 16).ptr == digits + 2 && byte != 0) {
            result += static_cast<char>(byte);
            i += 2;
        } else {
            result += text[i];
        }
    }
    return result;
}

} // namespace

TextureSearch::TextureSearch(const string& modelPath, vector<string> resourcePaths)
    : folder_(fs::folder(modelPath)), resourcePaths_(std::move(resourcePaths)) {}

vector<string> TextureSearch::listPlaces(const string& path) const {
    vector<string> places;
    const auto add = [&](const string& folder, const string& name) {
        const string place = fs::normalized(fs::joined(folder, name));
        if (!name.empty() && std::ranges::find(std::as_const(places), place) == places.cend())
            places.push_back(place);
    };
    const string name = fs::fileName(path);
    add(folder_, path);
    for (const char* folder : usualFolders)
        add(fs::joined(folder_, folder), name);
    for (const string& folder : std::as_const(resourcePaths_)) {
        add(folder, path);
        add(folder, name);
    }
    return places;
}

string TextureSearch::findIgnoringCase(const string& name) {
    if (!hasEntries_)
        entries_ = fs::master().findFiles(folder_.empty() ? "." : folder_, "*");
    hasEntries_ = true;
    const string wanted = base::toLower(name);
    for (const string& entry : std::as_const(entries_)) {
        const string place = fs::normalized(fs::joined(folder_, entry));
        if (base::toLower(entry) == wanted && isRegularFile(place))
            return place;
    }
    return {};
}

string TextureSearch::find(string_view texturePath, vector<string>& tried) {
    vector<string> spellings(1, cleaned(texturePath));
    if (const string other = cleaned(unescaped(texturePath)); other != spellings[0])
        spellings.push_back(other);
    for (const string& path : std::as_const(spellings))
        for (const string& place : listPlaces(path)) {
            if (isRegularFile(place))
                return place;
            tried.push_back(place);
        }
    for (const string& path : std::as_const(spellings))
        if (const string found = findIgnoringCase(fs::fileName(path)); !found.empty())
            return found;
    return {};
}

} // namespace assimp
