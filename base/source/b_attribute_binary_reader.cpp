#include "b_attribute_binary_reader.h"

#include "b_attribute_binary_writer.h"
#include "b_exception.h"
#include "b_factory.h"
#include "b_format.h"
#include "b_log.h"
#include "b_nested_level.h"

namespace base {

BinaryReader::BinaryReader(Stream& stream, BinaryReadOptions& options)
    : stream_(stream), options_(options) {
    if (options.state)
        return;
    own_ = std::make_unique<BinaryReadState>();
    own_->canSeek = (stream.capabilities() & streamSeekable) != 0;
    own_->left = std::numeric_limits<u64>::max();
    if (own_->canSeek) {
        const u64 size = stream.size();
        own_->left = size - std::min(stream.position(), size);
    }
    options.state = own_.get();
}

BinaryReader::~BinaryReader() {
    if (own_)
        options_.state = nullptr;
}

void BinaryReader::reportShortRead(u64 byteCount) {
    if ((stream_.flags() & streamThrowOnShortRead) != 0)
        throw exception(format("stream '{}': trying to read {} bytes, read {} bytes",
                               stream_.name(), byteCount, state().left),
                        "b_stream", "base::Stream::read", __LINE__);
}

bool BinaryReader::has(u64 byteCount) {
    if (byteCount <= state().left)
        return true;
    reportShortRead(byteCount);
    return false;
}

bool BinaryReader::bytes(void* destination, u64 byteCount) {
    BinaryReadState& state = this->state();
    if (!has(byteCount))
        return false;
    const u64 got = stream_.read(destination, byteCount);
    state.left -= got;
    return got == byteCount;
}

bool BinaryReader::text(string& text, u32 maxLength, const char* tooLong) {
    text.clear();
    u32 length = 0;
    if (!number(length))
        return false;
    if (length > maxLength)
        throw exception(tooLong, "b_attribute", "base::Attribute::read", __LINE__);
    const u64 step = state().canSeek ? length : blindStepBytes;
    if (!has(length))
        return false;
    while (text.size() < length) {
        const std::size_t done = text.size();
        text.resize(done + std::min<u64>(step, length - done));
        if (!bytes(text.data() + done, text.size() - done)) {
            text.clear();
            return false;
        }
    }
    return true;
}

bool BinaryReader::text(string& text) {
    return this->text(text, maxBinaryString,
                      "Trying to read a string bigger then 256MB, aborting...");
}

bool BinaryReader::name(name_id& name) {
    name = {};
    const BinaryReadState& state = this->state();
    if (state.hasNameTable) {
        u16 number = 0;
        if (!this->number(number))
            return false;
        if (number < state.names.size())
            name = state.names[number];
        return true;
    }
    string text;
    if (!this->text(text))
        return false;
    if (text.find('\0') == string::npos)
        name = nameServer().id(text);
    return true;
}

bool BinaryReader::skip(u64 byteCount) {
    constexpr u64 blockBytes = 1024;
    BinaryReadState& state = this->state();
    if (byteCount > state.left)
        throw exception(format("stream '{}': seeking pass the end of stream!", stream_.name()),
                        "b_attribute", "base::Attribute::read", __LINE__);
    if (state.canSeek && byteCount != 0) {
        stream_.setPosition(static_cast<i64>(byteCount), StreamOrigin::current);
        state.left -= byteCount;
        return true;
    }
    u8 block[blockBytes];
    for (u64 now = 0; byteCount != 0; byteCount -= now) {
        now = std::min(byteCount, blockBytes);
        if (!bytes(block, now))
            return false;
    }
    return true;
}

const BinaryType& BinaryReader::resolve(name_id storedType) {
    BinaryReadState& state = this->state();
    const auto [at, isNew] = state.types.try_emplace(storedType);
    if (!isNew)
        return at->second;
    BinaryType& resolved = at->second;
    const string_view text = storedType.view();
    const bool isOwnMap = text.starts_with(mapTypePrefix);
    const name_id type = isOwnMap ? n_map : storedType;
    if (!type.isEmpty() && state.attributeFactory->has(type))
        resolved.type = type;
    if (isOwnMap && text.size() > mapTypePrefix.size())
        resolved.mapType = nameServer().id(text.substr(mapTypePrefix.size()));
    return resolved;
}

std::unique_ptr<Attribute> BinaryReader::make(const BinaryType& type) {
    AttribFactory& factory = *state().attributeFactory;
    if (type.type == n_map)
        return std::make_unique<AttribMap>(factory, type.mapType);
    std::unique_ptr<Attribute> made(factory.create(type.type));
    if (!made)
        throw exception(format("Trying to access not registered attribute type '{}'.", type.type),
                        "b_attribute", "base::Attribute::read", __LINE__);
    return made;
}

IPlugin* BinaryReader::object(u32 storedId) const {
    if (storedId == IPlugin::noId || !options_.factory)
        return nullptr;
    const auto& objects = options_.factory->plugins();
    const u64 id = u64{storedId} + options_.firstId;
    IPlugin* found = id < objects.size() ? objects[id].get() : nullptr;
    if (!found)
        log().log(logSystem, logWarning,
                  "plugin factory| A reference to the missing plugin {} is left empty.", id);
    return found;
}

BinaryReader::Level::Level(BinaryReader& reader) : state_(reader.state()) {
    enterLevel(state_.depth, "base::Attribute::read");
}

} // namespace base
