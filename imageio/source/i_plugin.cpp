#include "i_plugin.h"

#include "i_formats.h"

namespace iio {

IImageReaderInterface::~IImageReaderInterface() = default;
IImageWriterInterface::~IImageWriterInterface() = default;
IImageIODesc::~IImageIODesc() = default;
ImageReaderPlugin::~ImageReaderPlugin() = default;
ImageIOPlugin::~ImageIOPlugin() = default;
ImageFormat::~ImageFormat() = default;

base::name_id IImageReaderInterface::interfaceName() {
    static const base::name_id id = base::nameServer().id("IImageReaderInterface");
    return id;
}

base::name_id IImageReaderInterface::name() const {
    return interfaceName();
}

ref<Image> IImageReaderInterface::loadThumbnail(base::Stream&) {
    return {};
}

ref<Image> IImageReaderInterface::loadPart(base::Stream&, u32) {
    return {};
}

base::name_id IImageWriterInterface::interfaceName() {
    static const base::name_id id = base::nameServer().id("IImageWriterInterface");
    return id;
}

base::name_id IImageWriterInterface::name() const {
    return interfaceName();
}

base::IPluginInterface* ImageFormat::queryInterface(base::name_id interfaceId) {
    if (interfaceId == IImageReaderInterface::interfaceName())
        return static_cast<IImageReaderInterface*>(this);
    if (interfaceId == IImageWriterInterface::interfaceName())
        return static_cast<IImageWriterInterface*>(this);
    return ImageIOPlugin::queryInterface(interfaceId);
}

base::IPlugin* ImageFormat::plugin() {
    return this;
}

} // namespace iio
