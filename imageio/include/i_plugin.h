#pragma once

#include "i_image.h"

#include "b_factory.h"
#include "stream/b_stream.h"

/// Picture files: what formats there are, and reading and writing by file name.
namespace iio {

/// Reads pictures of one format. An object serves one file.
class IImageReaderInterface : public base::IPluginInterface {
public:
    /// "IImageReaderInterface"
    static base::name_id interfaceName();

    ~IImageReaderInterface() override;
    base::name_id name() const override;
    /// Whether the stream starts like this format. The caller puts the position back.
    virtual bool checkSignature(base::Stream& stream) = 0;
    /// Fills `info` from the position on. False, with a message, if it can't.
    virtual bool readInfo(base::Stream& stream, ImageInfo& info) = 0;
    /// A reduced picture that the file holds; null for none.
    virtual ref<Image> loadThumbnail(base::Stream& stream);
    /// The picture, from the same position as `readInfo`, with `level` or, for -1, all levels.
    /// Null, with a message, if it can't.
    virtual ref<Image> load(base::Stream& stream, i32 level) = 0;
    /// One part of a file of several; null for none.
    virtual ref<Image> loadPart(base::Stream& stream, u32 part);
};

/// Writes pictures of one format. An object serves one file.
class IImageWriterInterface : public base::IPluginInterface {
public:
    /// "IImageWriterInterface"
    static base::name_id interfaceName();

    ~IImageWriterInterface() override;
    base::name_id name() const override;
    /// Whether a picture of this description can be written, after conversion if need be. Keeps
    /// what it needs of `info` for `save`.
    virtual bool canSave(base::Stream& stream, const ImageInfo& info) = 0;
    /// Converts what the format can't hold. False, with a message, if that or the writing fails.
    virtual bool save(base::Stream& stream, Image& image) = 0;
};

/// Bits of `IImageIODesc::capabilities`. The further bits of the formats' values say which kinds
/// and types of pictures they carry and are passed on as they are.
enum ImageCapability : u32 { canRead = 1, canWrite = 2 };

/// Describes a format: its short name is the description's type, its description text `info`.
class IImageIODesc : public base::IPluginDesc {
public:
    ~IImageIODesc() override;
    virtual u32 capabilities() const = 0;
    /// In lower case, joined by ";".
    virtual const char* extensions() const = 0;
};

/// What all formats share: the attributes that configure a load or save.
class ImageReaderPlugin : public base::IPlugin {
public:
    using base::IPlugin::IPlugin;
    ~ImageReaderPlugin() override;

    /// Borrowed for the life of this object. Later ones come before earlier ones.
    void pushAttributes(const base::AttribMap& attributes) {
        configuration_.push_back(&attributes);
    }

protected:
    /// The first value of that name, from the attributes pushed last to `own`; null if there is
    /// none.
    template <class T>
    const T* findSetting(base::name_id name, const base::AttribMap& own) const {
        for (auto at = configuration_.size(); at-- > 0;) {
            if (const T* value = configuration_[at]->findAttribute<T>(name))
                return value;
        }
        return own.findAttribute<T>(name);
    }
    template <class T>
    const vector<T>* findVecSetting(base::name_id name, const base::AttribMap& own) const {
        for (auto at = configuration_.size(); at-- > 0;) {
            if (const vector<T>* value = configuration_[at]->findVecAttribute<T>(name))
                return value;
        }
        return own.findVecAttribute<T>(name);
    }

private:
    vector<const base::AttribMap*> configuration_;
};

/// A format that is written as well as read.
class ImageIOPlugin : public ImageReaderPlugin {
public:
    using ImageReaderPlugin::ImageReaderPlugin;
    ~ImageIOPlugin() override;
};

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
