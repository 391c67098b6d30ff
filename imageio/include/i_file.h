#pragma once

#include "i_image.h"

#include "stream/b_stream.h"

/// Reading and writing picture files by name.
namespace iio {

class IImageIODesc;

/// Fills `info` from the file at `path`. The extension chooses the formats that are tried; the
/// first bytes must fit. False if there is none; what can't be opened reports itself. Throws what
/// an open stream throws while its first bytes are looked at.
bool readImageInfo(const string& path, ImageInfo& info);
bool readImageInfo(base::Stream& stream, ImageInfo& info);

/// The picture at `path`, null with messages of level 2 if it can't be loaded. `level` -1 means
/// all levels; `attributes` configure the reader; `reserved` has no effect.
ref<Image> loadImage(const string& path, const base::AttribMap* attributes = nullptr,
                     u32 reserved = 0, i32 level = -1);
ref<Image> loadImage(base::Stream& stream, const base::AttribMap* attributes = nullptr,
                     u32 reserved = 0, i32 level = -1);

/// Writes `image` in the format of the extension, replacing what is there; false for an unknown
/// one, with nothing written, and for what fails. `attributes` come before those of the image.
bool saveImage(Image& image, const string& path);
bool saveImage(Image& image, const string& path, const base::AttribMap& attributes);
bool saveImage(Image& image, base::Stream& stream);
bool saveImage(Image& image, base::Stream& stream, const base::AttribMap& attributes);

/// The extensions of all formats, joined by ";".
string readerExtensions();
/// Those of the formats that are written. `flag` has no effect.
string writerExtensions(u32 flag = 0);
/// The format that lists `extension`, in any case; null for none.
IImageIODesc* findPlugin(string_view extension);
/// Whether such a format has all of `bits`.
bool hasCapability(string_view extension, u32 bits);

} // namespace iio
