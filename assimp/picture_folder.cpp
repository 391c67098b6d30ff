#include "assimp/picture_folder.h"

#include "b_format.h"
#include "b_string_convert.h"
#include "stream/b_fs.h"

#include <algorithm>

namespace assimp {

using base::string;
using base::string_view;

namespace {

/// The text without control bytes and separators, cut before it gets too long for a file name;
/// `otherwise` if nothing is left.
string fileNamePart(string_view text, std::size_t longest, string_view otherwise) {
    string part = base::toValidUtf8(text);
    std::erase_if(part, [](char c) {
        return static_cast<unsigned char>(c) < 0x20 || c == 0x7f || c == '/' || c == '\\';
    });
    if (part.size() > longest) {
        const auto isContinuation = [](char c) { return (c & 0xc0) == 0x80; };
        while (longest > 0 && isContinuation(part[longest]))
            --longest;
        part.resize(longest);
    }
    return part.empty() ? string(otherwise) : part;
}

void writeFile(const string& path, std::span<const base::u8> bytes) {
    base::Stream stream;
    base::fs::master().open(stream, path, base::fs::openReplace);
    stream.setFlags(stream.flags() | base::streamThrowOnShortWrite);
    stream.write(bytes.data(), bytes.size());
}

} // namespace

string PictureFolder::add(string_view name, string_view extension,
                          std::span<const base::u8> bytes) {
    const string stem = fileNamePart(name, 100, "texture");
    const string ending = fileNamePart(extension, 10, "bin");
    string file = base::format("{}.{}", stem, ending);
    for (int i = 2; !names_.insert(base::toLower(file)).second; ++i)
        file = base::format("{}_{}.{}", stem, i, ending);
    if (!folder_)
        folder_.emplace("pictures");
    const string path = folder_->path() + file;
    writeFile(path, bytes);
    return path;
}

} // namespace assimp
