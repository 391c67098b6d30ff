#pragma once

#include "i_image.h"

#include "b_factory.h"
#include "stream/b_stream.h"

/// What a format of picture files consists of.
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
        return findFirst(own,
                         [&](const base::AttribMap& map) { return map.findAttribute<T>(name); });
    }
    template <class T>
    const vector<T>* findVecSetting(base::name_id name, const base::AttribMap& own) const {
        return findFirst(own,
                         [&](const base::AttribMap& map) { return map.findVecAttribute<T>(name); });
    }

private:
    template <class Find>
    auto findFirst(const base::AttribMap& own, Find find) const {
        for (auto at = configuration_.size(); at-- > 0;) {
            if (const auto* value = find(*configuration_[at]))
                return value;
        }
        return find(own);
    }

    vector<const base::AttribMap*> configuration_;
};

/// A format that is written as well as read.
class ImageIOPlugin : public ImageReaderPlugin {
public:
    using ImageReaderPlugin::ImageReaderPlugin;
    ~ImageIOPlugin() override;
};

} // namespace iio
