#include "b_attribute_binary_reader.h"
#include "b_attribute_binary_writer.h"

#include "b_exception.h"
#include "b_factory.h"
#include "b_format.h"
#include "b_log.h"
#include "b_stored_document.h"
#include "stream/b_stream_workers.h"

#include <optional>

namespace base {

namespace {

constexpr char magic[] = {'B', 'P', 'F', '1'};
constexpr u32 factoryVersion = 1;
constexpr u32 tableVersion = 1;
constexpr u32 nameTableFlag = 1u << 0;
constexpr u32 noType = 0xffffffff; ///< of a place in the list without an object
constexpr u64 bufferBytes = 64 * 1024;

/// A place in the list of objects.
struct ObjectRecord {
    u32 type;
    u32 id;
};
static_assert(sizeof(ObjectRecord) == 8);

/// Of an object: its size, flags and number of attributes.
constexpr u64 smallestObjectBytes = 9;

[[noreturn]] void throwDocument(string text, const char* function) {
    throw exception(std::move(text), "b_factory", function, __LINE__);
}

/// Makes room in a stream that grows, which would otherwise move its content again and again, and
/// gives back what was not written.
class RoomInStream : public NonCopyable {
public:
    RoomInStream(Stream& stream, u64 byteCount) : stream_(stream) {
        if ((stream.capabilities() & streamResizable) == 0)
            return;
        sizeBefore_ = stream.size();
        stream.setSize(std::max(*sizeBefore_, stream.position() + byteCount));
    }
    ~RoomInStream() {
        if (sizeBefore_)
            stream_.setSize(std::max(*sizeBefore_, stream_.position()));
    }

private:
    Stream& stream_;
    std::optional<u64> sizeBefore_;
};

bool isStoredObject(const ref<IPlugin>& object) {
    return object && !object->hasFlag(attribTransient);
}

class DocumentWriter {
public:
    DocumentWriter(const PluginFactory& factory, const AttribMap& attributes)
        : factory_(factory), attributes_(attributes) {
        measureAll(true);
        if (names_->names().size() > BinaryNameTable::maxNames)
            measureAll(false);
        for (const name_id type : state_.attributeTypes.names())
            checkType(type);
        for (const name_id type : types_.names())
            checkType(type);
    }

    /// At least what `write` will write.
    u64 byteCount() const {
        u64 total = payloadBytes_ + attributes_.typeName().view().size() + 256 +
                    factory_.pluginCount() * u64{16};
        if (names_)
            total += textBytes(names_->names());
        return total + textBytes(state_.attributeTypes.names()) + textBytes(types_.names());
    }

    void write(Stream& stream) {
        BinaryWriteOptions options{&factory_, &state_};
        BinaryWriter out(stream, options);
        writeHead(out);
        out.text(attributes_.typeName().view());
        out.number(attributeBytes_);
        attributes_.write(stream, options);
        writeList(out);

        ListProgress progress(writingPlugins, factory_.pluginCount());
        for (std::size_t i = 0, stored = 0; i < factory_.plugins().size(); ++i) {
            progress.at(i);
            const ref<IPlugin>& object = factory_.plugins()[i];
            if (!isStoredObject(object))
                continue;
            state_.object = object.get();
            out.number(std::as_const(objectBytes_)[stored++]);
            object->write(stream, options);
        }
    }

private:
    void measureAll(bool withNameTable) {
        names_.reset();
        state_ = {};
        types_ = {};
        objectBytes_.clear();
        if (withNameTable)
            state_.nameTable = &names_.emplace();
        attributeBytes_ = measure(attributes_, nullptr);
        payloadBytes_ = attributeBytes_;
        for (const ref<IPlugin>& object : factory_.plugins()) {
            if (!isStoredObject(object))
                continue;
            types_.add(object->typeName());
            objectBytes_.push_back(measure(*object, object.get()));
            payloadBytes_ += objectBytes_.back();
        }
    }

    u32 measure(const AttribMap& map, const IPlugin* object) {
        const u64 byteCount = measureBinary(map, state_);
        if (byteCount > std::numeric_limits<u32>::max())
            throwDocument(
                object ? format("plugin factory| Plugin {} '{}' takes {} bytes, more than the 4 "
                                "GiB that can be stored!",
                                object->id(), object->getName(), byteCount)
                       : format("plugin factory| The attributes of document '{}' take {} bytes, "
                                "more than the 4 GiB that can be stored!",
                                factory_.name(), byteCount),
                "base::PluginFactory::write");
        return static_cast<u32>(byteCount);
    }

    static void checkType(name_id type) {
        if (type.view().size() > maxBinaryTableString)
            throwDocument(format("factory: The type name '{}' is longer than the 2048 bytes that "
                                 "can be stored!",
                                 type),
                          "base::PluginFactory::write");
    }

    static u64 textBytes(const vector<name_id>& names) {
        u64 total = 0;
        for (const name_id name : names)
            total += sizeof(u32) + name.view().size();
        return total;
    }

    static void writeTexts(BinaryWriter& out, const vector<name_id>& names) {
        out.count(names.size());
        for (const name_id name : names)
            out.text(name.view());
    }

    void writeHead(BinaryWriter& out) const {
        out.bytes(magic, sizeof magic);
        out.number(factoryVersion);
        out.number(names_ ? nameTableFlag : 0);
        if (names_)
            writeTexts(out, names_->names());
        out.number(tableVersion);
        writeTexts(out, state_.attributeTypes.names());
        writeTexts(out, types_.names());
    }

    void writeList(BinaryWriter& out) {
        vector<ObjectRecord> records;
        records.reserve(factory_.plugins().size());
        for (const ref<IPlugin>& object : factory_.plugins())
            records.push_back({isStoredObject(object) ? types_.add(object->typeName()) : noType,
                               static_cast<u32>(records.size())});
        out.count(records.size());
        out.bytes(std::as_const(records).data(), records.byteLength());
    }

    const PluginFactory& factory_;
    const AttribMap& attributes_;
    std::optional<BinaryNameTable> names_;
    BinaryWriteState state_;
    BinaryTypeTable types_; ///< of the objects
    u32 attributeBytes_ = 0;
    vector<u32> objectBytes_; ///< of those that are stored
    u64 payloadBytes_ = 0;
};

/// Reads up to the objects before it touches the factory.
class DocumentReader final : public StoredDocument {
public:
    DocumentReader(PluginFactory& factory, Stream& stream)
        : factory_(factory), stream_(stream), options_{&factory, factory.pluginCount()},
          in_(stream_, options_) {
        in_.state().attributeFactory = &factory.attributeFactory();
    }

    u32 objectCount() const override { return static_cast<u32>(records_.size()); }

    /// All that stands before the objects. False if it ends early or the list is broken.
    bool readHead() {
        return readVersions() && readAttributeTypes() && readTexts(types_, true) &&
               in_.text(attributesType_) && readAttributeBytes() && readList();
    }

    void createObjects() override {
        for (const ObjectRecord& record : std::as_const(records_)) {
            if (record.type == noType)
                continue;
            const name_id type = std::as_const(types_)[record.type];
            createStored(factory_, type, options_.firstId + record.id);
        }
    }

    void readObjects() override {
        ListProgress progress(readingPlugins, records_.size());
        for (const ObjectRecord& record : std::as_const(records_)) {
            progress.at(record.id);
            if (record.type == noType)
                continue;
            const ref<IPlugin> object = factory_.plugin(options_.firstId + record.id);
            u32 byteCount = 0;
            if (!in_.number(byteCount) ||
                !in_.payload(byteCount, [&] { return !object || object->read(stream_, options_); }))
                return;
        }
    }

    std::unique_ptr<AttribMap> readAttributes() override {
        Stream stream = memStreamView(std::as_const(attributeBytes_).data(), attributeBytes_.size(),
                                      stream_.name());
        stream.setFlags(stream_.flags());
        in_.state().left = attributeBytes_.size();
        in_.state().canSeek = true;
        auto read = std::make_unique<AttribMap>(factory_.attributeFactory());
        read->read(stream, options_);
        if (!attributesType_.empty())
            read->setTypeName(nameServer().id(attributesType_));
        return read;
    }

private:
    bool readVersions() {
        char start[sizeof magic] = {};
        u32 version = 0, flags = 0;
        if (!in_.bytes(start, sizeof start))
            return false;
        if (!std::equal(std::begin(start), std::end(start), magic))
            throwReading(format("plugin factory: '{}' is no binary document!", stream_.name()));
        if (!in_.number(version))
            return false;
        if (version != factoryVersion)
            throwReading(format("plugin factory: Unsupported plugin factory version! Current "
                                "version {}, needed {}.",
                                factoryVersion, version));
        if (!in_.number(flags))
            return false;
        if ((flags & ~nameTableFlag) != 0)
            throwReading(
                format("plugin factory: '{}' has the unknown flags {}!", stream_.name(), flags));
        in_.state().hasNameTable = flags == nameTableFlag;
        return flags == 0 || readTexts(in_.state().names, false);
    }

    bool readAttributeTypes() {
        u32 version = 0;
        if (!in_.number(version))
            return false;
        if (version != tableVersion)
            throwReading(
                format("factory: Unsupported factory version! Supported version {}, needed {}.",
                       tableVersion, version));
        vector<name_id> types;
        if (!readTexts(types, true))
            return false;
        for (const name_id type : std::as_const(types))
            if (!type || !factory_.attributeFactory().has(type))
                log().log(logSystem, logWarning,
                          "factory: Detected unknown item type during loading - '{}'!", type);
        return true;
    }

    /// Texts with a zero byte give absent names.
    bool readTexts(vector<name_id>& names, bool areTypes) {
        u32 count = 0;
        if (!in_.number(count))
            return false;
        string text;
        for (u32 i = 0; i < count; ++i) {
            if (!(areTypes ? in_.text(text, maxBinaryTableString,
                                      "factory: Attribute type with more then 2K detected! "
                                      "Probably a corrupted file.")
                           : in_.text(text)))
                return false;
            names.push_back(text.find('\0') == string::npos ? nameServer().id(text) : name_id());
        }
        return true;
    }

    bool readAttributeBytes() {
        u32 byteCount = 0;
        return in_.number(byteCount) && in_.values(attributeBytes_, byteCount);
    }

    bool readList() {
        u32 count = 0;
        if (!in_.number(count) || !in_.values(records_, count))
            return false;
        if (u64{options_.firstId} + count >= IPlugin::noId)
            throwReading(
                format("plugin factory| '{}' has {} plugins, more than there are ids left!",
                       stream_.name(), count));
        u32 objects = 0;
        for (u32 i = 0; i < count; ++i) {
            const ObjectRecord& record = std::as_const(records_)[i];
            const bool hasObject = record.type != noType;
            if (record.id != i || (hasObject && (record.type >= types_.size() ||
                                                 !std::as_const(types_)[record.type]))) {
                log().log(logSystem, logError,
                          "plugin factory| Invalid plugin type record for id {}/{}, aborting...",
                          record.id, record.type);
                return false;
            }
            objects += hasObject ? 1 : 0;
        }
        return in_.has(objects * smallestObjectBytes);
    }

    [[noreturn]] static void throwReading(string text) {
        throwDocument(std::move(text), "base::PluginFactory::read");
    }

    PluginFactory& factory_;
    Stream& stream_;
    BinaryReadOptions options_;
    BinaryReader in_;
    vector<name_id> types_; ///< of the objects
    string attributesType_;
    vector<u8> attributeBytes_;
    vector<ObjectRecord> records_;
};

} // namespace

void PluginFactory::write(Stream& target) const {
    DocumentWriter document(*this, attributes_);
    const u32 capabilities = target.capabilities();
    if ((capabilities & streamResizable) != 0 || (capabilities & streamSeekable) == 0) {
        const RoomInStream room(target, document.byteCount());
        document.write(target);
        return;
    }
    Stream buffered = bufferedStream(target, bufferBytes, BufferMode::write);
    buffered.setFlags(target.flags());
    document.write(buffered);
    buffered.flush();
}

bool PluginFactory::read(Stream& source) {
    const bool canSeek = (source.capabilities() & streamSeekable) != 0;
    Stream stream = canSeek ? bufferedStream(source, bufferBytes, BufferMode::read) : source;
    stream.setFlags(source.flags());
    DocumentReader document(*this, stream);
    if (!document.readHead())
        return false;

    readDocument(document, static_cast<i32>(factoryVersion));
    if (canSeek)
        source.setPosition(static_cast<i64>(stream.position()));
    return true;
}

} // namespace base
