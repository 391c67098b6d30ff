#include "assimp/picture_folder.h"

#include "assimp/picture_decoding.h"
#include "b_exception.h"
#include "b_format.h"
#include "b_string_convert.h"
#include "i_file.h"
#include "stream/b_fs.h"
#include "stream/b_stream_workers.h"

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
    part.resize(base::cutUtf8(part, longest).size());
    return part.empty() ? string(otherwise) : part;
}

[[noreturn]] void fail(const char* reason, int line) {
    throw base::exception(reason, "picture_folder", "assimp::PictureFolder", line);
}

} // namespace

string PictureFolder::newPath(string_view name, string_view extension) {
    const string stem = fileNamePart(name, 100, "texture");
    const string ending = fileNamePart(extension, 10, "bin");
    string file = base::format("{}.{}", stem, ending);
    for (int i = 2; !names_.insert(base::toLower(file)).second; ++i)
        file = base::format("{}_{}.{}", stem, i, ending);
    if (!folder_)
        folder_.emplace("pictures");
    return folder_->path() + file;
}

string PictureFolder::add(string_view name, string_view extension,
                          std::span<const base::u8> bytes) {
    string path = newPath(name, extension);
    base::fs::writeFile(path, bytes.data(), bytes.size());
    return path;
}

string PictureFolder::add(string_view name, iio::Image& image) {
    string path = newPath(name, "png");
    if (!iio::saveImage(image, path))
        fail("It can't be written.", __LINE__);
    return path;
}

string PictureFolder::addReadable(string_view name, std::span<const base::u8> bytes,
                                  PictureKind kind) {
    if (kind == PictureKind::unknown)
        fail("It is in no format that can be read.", __LINE__);
    if (kind != PictureKind::foreign) {
        base::Stream file = base::memStreamView(bytes.data(), bytes.size(),
                                                base::format("{}.{}", name, extensionOf(kind)));
        checkPicture(file, kind);
        return add(name, extensionOf(kind), bytes);
    }
    const base::ref<iio::Image> image = decodePicture(bytes);
    if (!image)
        fail("It can't be read.", __LINE__);
    return add(name, *image);
}

} // namespace assimp
