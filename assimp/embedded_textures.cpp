#include "assimp/embedded_textures.h"

#include "assimp/library_text.h"
#include "assimp/picture_folder.h"

#include "b_exception.h"
#include "b_string_convert.h"
#include "stream/b_fs.h"

#include <assimp/scene.h>

#include <algorithm>
#include <cstddef>
#include <cstring>
#include <span>

namespace assimp {

namespace fs = base::fs;
using base::string;
using base::string_view;
using base::u32;
using base::u64;
using base::u8;

namespace {

[[noreturn]] void fail(const char* reason) {
    throw base::exception(reason, "embedded_textures", "assimp::writeEmbedded", __LINE__);
}

string writeCompressed(const aiTexture& texture, const string& name, PictureFolder& folder) {
    const std::span bytes(reinterpret_cast<const u8*>(texture.pcData), texture.mWidth);
    const string_view hint(texture.achFormatHint,
                           strnlen(texture.achFormatHint, sizeof texture.achFormatHint));
    const string named = fs::extension(name);
    return folder.addReadable(fs::stem(name), bytes,
                              kindOf(bytes, named.empty() ? hint : string_view(named)));
}

/// Texels that are not in a format of their own. Of formats that know no alpha they may come with
/// one of 0 everywhere.
string writeTexels(const aiTexture& texture, const string& name, PictureFolder& folder) {
    const u64 count = u64(texture.mWidth) * texture.mHeight;
    if (count > (u64(1) << 26))
        fail("It has more than 2^26 pixels.");
    auto image = base::makeRef<iio::Image>();
    image->create(texture.mWidth, texture.mHeight, 1, 1, iio::Image::kBGRA,
                  iio::Image::IT_UNSIGNED_BYTE);
    if (!image->data())
        fail("There is not enough memory.");
    static_assert(sizeof(aiTexel) == 4 && offsetof(aiTexel, b) == 0 && offsetof(aiTexel, a) == 3);
    std::memcpy(image->data(), texture.pcData, image->memorySize());
    const std::span texels(texture.pcData, count);
    if (std::ranges::all_of(texels, [](const aiTexel& texel) { return texel.a == 0; }))
        image = image->convertFormat(iio::Image::kRGB);
    return folder.add(fs::stem(name), *image);
}

} // namespace

const aiTexture* findEmbedded(const aiScene& scene, string_view path) {
    const std::span textures(scene.mTextures, scene.mTextures ? scene.mNumTextures : 0);
    if (path.starts_with('*')) {
        u32 index = 0;
        return base::tryFromString(path.substr(1), index) && index < textures.size()
                   ? textures[index]
                   : nullptr;
    }
    const aiTexture* sameFile = nullptr;
    for (const aiTexture* texture : textures) {
        if (!texture || texture->mFilename.length == 0)
            continue;
        const string_view name = viewOf(texture->mFilename);
        if (name == path)
            return texture;
        if (!sameFile && fs::fileName(name) == fs::fileName(path))
            sameFile = texture;
    }
    return sameFile;
}

string writeEmbedded(const aiTexture& texture, string_view path, PictureFolder& folder) {
    if (!texture.pcData || texture.mWidth == 0)
        fail("It is empty.");
    string name = fs::fileName(viewOf(texture.mFilename));
    if (name.empty())
        name = path.starts_with('*') ? "texture" + string(path.substr(1)) : fs::fileName(path);
    return texture.mHeight == 0 ? writeCompressed(texture, name, folder)
                                : writeTexels(texture, name, folder);
}

} // namespace assimp
