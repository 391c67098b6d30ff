#include "i_file.h"

#include "i_formats.h"

#include "b_exception.h"
#include "b_log.h"
#include "b_string_convert.h"
#include "stream/b_fs.h"

namespace iio {

namespace {

namespace fs = base::fs;

constexpr u32 openForReading = fs::openRead | fs::openShareRead;
constexpr u32 openPacked = 128; ///< bit of an open mode

constexpr const char* readingFault = "Unable to open the image file for reading!";
constexpr const char* writingFault = "Unable to open the image file for writing!";

/// The formats, in order. The objects that they make belong to a factory of their own.
struct Registry {
    ref<base::PluginFactory> factory;
    vector<ref<IImageIODesc>> formats;

    void add(const ref<IImageIODesc>& format) {
        factory->registerDesc(ref<base::IPluginDesc>(format.get()));
        formats.push_back(format);
    }
};

/// Never destroyed: pictures may still be saved while the process ends.
const Registry& registry() {
    static const Registry& made = *[] {
        auto* fresh = new Registry{ref<base::PluginFactory>(new base::PluginFactory("images")), {}};
#define IIO_ADD_FORMAT(name) fresh->add(describe##name());
        IIO_FORMATS(IIO_ADD_FORMAT)
#undef IIO_ADD_FORMAT
        return fresh;
    }();
    return made;
}

/// Whether the whole `extension` is an entry of the list of `format`. It is in lower case.
bool listsExtension(const IImageIODesc& format, string_view extension) {
    for (string_view entry : base::split(format.extensions(), ';')) {
        if (entry == extension && !entry.empty())
            return true;
    }
    return false;
}

IImageIODesc* findFormat(string_view lowerCaseExtension, u32 capabilities) {
    for (const ref<IImageIODesc>& format : registry().formats) {
        if ((format->capabilities() & capabilities) == capabilities &&
            listsExtension(*format, lowerCaseExtension))
            return format.get();
    }
    return nullptr;
}

/// A plugin at work on one file, and one of its interfaces.
template <class Interface>
struct Worker {
    Worker() = default;
    Worker(IImageIODesc& format, const base::AttribMap* attributes)
        : plugin(registry().factory->create(format.type, base::createLoose)) {
        // Every description of the list makes objects of this class.
        auto& configurable = static_cast<ImageReaderPlugin&>(*plugin);
        if (attributes)
            configurable.pushAttributes(*attributes);
        interface = static_cast<Interface*>(plugin->queryInterface(Interface::interfaceName()));
    }

    ref<base::IPlugin> plugin;
    Interface* interface = nullptr; ///< null for none
};

/// The reader of the first format that lists the stream's extension and knows its first bytes.
Worker<IImageReaderInterface> findReader(base::Stream& stream, const base::AttribMap* attributes) {
    const string extension = base::toLower(fs::extension(stream.name()));
    for (const ref<IImageIODesc>& format : registry().formats) {
        if (!listsExtension(*format, extension))
            continue;
        Worker<IImageReaderInterface> reader(*format, attributes);
        if (!reader.interface)
            continue;
        const u64 start = stream.position();
        const bool fits = reader.interface->checkSignature(stream);
        stream.setPosition(static_cast<i64>(start));
        if (fits)
            return reader;
    }
    return {};
}

/// Logs what is being thrown under `message`. To be called in a handler.
void reportThrown(string_view message) {
    base::Log& log = base::log();
    try {
        throw;
    } catch (const base::exception& error) {
        log.log(base::logIO, base::logError, message);
        error.report(log);
    } catch (const std::exception& error) {
        log.log(base::logIO, base::logError, message);
        log.log(base::logIO, base::logError, error.what());
    } catch (...) {
        log.log(base::logIO, base::logError, "{} Unhandled exception has occurred!", message);
    }
}

/// A stream on the file at `path`, closed if it can't be opened, which is logged then.
base::Stream openReported(const string& path, u32 mode, string_view message) {
    base::Stream stream;
    try {
        fs::master().open(stream, path, mode);
    } catch (...) {
        reportThrown(message);
    }
    return stream;
}

/// The extension by which a writer is chosen, in lower case: of "a.png.gz", which no format lists
/// as it stands, the inner one.
struct WriterChoice {
    explicit WriterChoice(const string& path) : extension(base::toLower(fs::extension(path))) {
        if (findFormat(extension, 0))
            return;
        isPacked = true;
        extension = base::toLower(fs::stem(fs::extension(path, 1), 1));
        if (!findFormat(extension, 0))
            extension.clear();
    }

    string extension; ///< empty if no format has it
    bool isPacked = false;
};

ImageInfo describeForSaving(const Image& image) {
    ImageInfo info = image.info;
    info.level0 = ImageLevelInfo();
    info.levels.clear();
    info.format = image.format();
    info.type = image.type();
    info.flags = image.isCube() ? ImageInfo::cubeMap : u8(0);
    const auto describe = [](const Image& level, ImageLevelInfo& target) {
        target.width = level.width();
        target.height = level.height();
        target.depth = level.depth();
    };
    describe(image, info.level0);
    for (u32 n = 1; n <= image.levelCount(); ++n) {
        if (const Image* level = image.level(n))
            describe(*level, info.levels.emplace_back());
    }
    return info;
}

bool saveWith(Image& image, base::Stream& stream, const string& extension,
              const base::AttribMap* attributes) {
    IImageIODesc* format = findFormat(extension, canWrite);
    if (!format)
        return false;
    const Worker<IImageWriterInterface> writer(*format, attributes);
    return writer.interface && writer.interface->canSave(stream, describeForSaving(image)) &&
           writer.interface->save(stream, image);
}

bool saveStream(Image& image, base::Stream& stream, const base::AttribMap* attributes) {
    const WriterChoice choice(stream.name());
    return !choice.isPacked && saveWith(image, stream, choice.extension, attributes);
}

bool saveFile(Image& image, const string& path, const base::AttribMap* attributes) {
    const WriterChoice choice(path);
    if (choice.extension.empty())
        return false;
    const u32 mode = fs::openReplace | (choice.isPacked ? openPacked : 0);
    base::Stream stream = openReported(path, mode, writingFault);
    return stream.isOpen() && saveWith(image, stream, choice.extension, attributes);
}

string joinExtensions(u32 capabilities) {
    string list;
    for (const ref<IImageIODesc>& format : registry().formats) {
        if ((format->capabilities() & capabilities) != capabilities)
            continue;
        if (!list.empty())
            list += ';';
        list += format->extensions();
    }
    return list;
}

} // namespace

bool readImageInfo(const string& path, ImageInfo& info) {
    base::Stream stream;
    try {
        fs::master().open(stream, path, openForReading);
    } catch (const base::exception& error) {
        error.report(base::log());
        return false;
    } catch (...) {
        return false;
    }
    return readImageInfo(stream, info);
}

bool readImageInfo(base::Stream& stream, ImageInfo& info) {
    const Worker<IImageReaderInterface> reader = findReader(stream, nullptr);
    if (!reader.interface)
        return false;
    info = ImageInfo();
    return reader.interface->readInfo(stream, info);
}

ref<Image> loadImage(const string& path, const base::AttribMap* attributes, u32 reserved,
                     i32 level) {
    base::Stream stream = openReported(path, openForReading, readingFault);
    if (!stream.isOpen())
        return {};
    return loadImage(stream, attributes, reserved, level);
}

ref<Image> loadImage(base::Stream& stream, const base::AttribMap* attributes, u32, i32 level) {
    const string fault = base::format("Unable to load {}", stream.name());
    ref<Image> image;
    try {
        const Worker<IImageReaderInterface> reader = findReader(stream, attributes);
        if (reader.interface)
            image = reader.interface->load(stream, level);
    } catch (...) {
        reportThrown(fault);
        return {};
    }
    if (!image) {
        base::log().log(base::logIO, base::logError, fault);
        return {};
    }
    image->setPath(fs::normalized(stream.name()));
    image->setFromFile(true);
    return image;
}

bool saveImage(Image& image, const string& path) {
    return saveFile(image, path, nullptr);
}

bool saveImage(Image& image, const string& path, const base::AttribMap& attributes) {
    return saveFile(image, path, &attributes);
}

bool saveImage(Image& image, base::Stream& stream) {
    return saveStream(image, stream, nullptr);
}

bool saveImage(Image& image, base::Stream& stream, const base::AttribMap& attributes) {
    return saveStream(image, stream, &attributes);
}

string readerExtensions() {
    return joinExtensions(0);
}

string writerExtensions(u32) {
    return joinExtensions(canWrite);
}

IImageIODesc* findPlugin(string_view extension) {
    return findFormat(base::toLower(extension), 0);
}

bool hasCapability(string_view extension, u32 bits) {
    const IImageIODesc* format = findPlugin(extension);
    return format && (format->capabilities() & bits) == bits;
}

} // namespace iio
