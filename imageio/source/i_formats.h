#pragma once

#include "i_plugin.h"

/// The formats that are built, and what they are made with.
///
/// A format is one row of the list below and one file (or a few) with a class `Imageio` + row name,
/// derived from `ImageFormat`, and with what describes it to the registry:
///
///     ref<IImageIODesc> describeTGA() {
///         return makeFormat<ImageioTGA>("tga", "Truevision Targa", "tga", 32771);
///     }
///
/// The class inherits the constructor of `ImageFormat` and implements the five operations of the
/// two interfaces that are left pure: `checkSignature`, `readInfo`, `load`, `canSave`, `save`.
/// Messages name the file by `stream.name()`. `load` fills the picture's `info` as `readInfo` would
/// and answers null for a level that the file lacks; path and mark "from a file" are set for it.
/// A writer finds its attributes with `findSetting<T>(name, image.attributes())`.
namespace iio {

/// In the order in which they are tried.
#define IIO_FORMATS(X) \
    X(TGA)             \
    X(PNG)             \
    X(JPG)

#define IIO_DECLARE_FORMAT(name) ref<IImageIODesc> describe##name();
IIO_FORMATS(IIO_DECLARE_FORMAT)
#undef IIO_DECLARE_FORMAT

/// A format that is read and written: gives out its two interfaces.
class ImageFormat : public ImageIOPlugin,
                    public IImageReaderInterface,
                    public IImageWriterInterface {
public:
    using ImageIOPlugin::ImageIOPlugin;
    ~ImageFormat() override;
    base::IPluginInterface* queryInterface(base::name_id name) override;
    base::IPlugin* plugin() override;
};

/// Describes the format that `Plugin` implements.
template <class Plugin>
class RegisterStaticPlugin final : public IImageIODesc {
public:
    /// `formatExtensions` as `extensions()`; the texts outlive the description.
    RegisterStaticPlugin(const char* name, const char* description, const char* formatExtensions,
                         u32 formatCapabilities)
        : extensions_(formatExtensions), capabilities_(formatCapabilities) {
        type = base::nameServer().id(name);
        info = description;
        author = "Scene export team";
    }

    base::IPlugin* create(base::PluginFactory& factory, u32 id) override {
        return new Plugin(ref<base::IPluginDesc>(this), &factory, id);
    }
    u32 capabilities() const override { return capabilities_; }
    const char* extensions() const override { return extensions_; }

private:
    const char* extensions_;
    u32 capabilities_;
};

/// The description of `Plugin`, see the table of formats above.
template <class Plugin>
ref<IImageIODesc> makeFormat(const char* name, const char* description, const char* extensions,
                             u32 capabilities) {
    return ref<IImageIODesc>(
        new RegisterStaticPlugin<Plugin>(name, description, extensions, capabilities));
}

} // namespace iio
