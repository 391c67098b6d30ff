#pragma once

#include "b_factory.h"
#include "b_log.h"

/// What the forms that documents are stored in have in common.
namespace base {

constexpr u32 storedFlags = 0xff; ///< the bits of the flags word that are stored

/// False for what maps leave out and arrays write as null: transient attributes, and links that
/// start at a transient object.
bool isStored(const Attribute& attribute);

/// Reports how far a list is, as often as the percentage changes, and the end when it dies.
class ListProgress : public NonCopyable {
public:
    ListProgress(string_view text, std::size_t count) : text_(text), count_(count) {}
    ~ListProgress() { log().progressEnd(); }
    void at(std::size_t index) {
        const u32 percent = static_cast<u32>(u64{index} * 100 / count_);
        if (percent != std::exchange(percent_, percent))
            log().progress(percent, text_);
    }

private:
    string_view text_;
    std::size_t count_;
    u32 percent_ = 101; ///< the last that was reported
};

constexpr const char* readingPlugins = "Reading plugins";
constexpr const char* writingPlugins = "Writing plugins";

/// A document whose parts are read one after the other by `PluginFactory::readDocument`.
class StoredDocument {
public:
    virtual ~StoredDocument() = default;
    /// The length of its list of objects.
    virtual u32 objectCount() const = 0;
    /// Makes all objects at once, so that references find theirs whatever their order. Their places
    /// are in the factory's list then, empty.
    virtual void createObjects() = 0;
    virtual void readObjects() = 0;
    /// The document's own attributes, whose references need the objects; null if there are none.
    virtual std::unique_ptr<AttribMap> readAttributes() = 0;
};

/// The id of an object in the list that it is read into. None stays none.
constexpr u32 shiftedId(u32 storedId, u32 firstId) {
    const u64 id = u64{storedId} + firstId;
    return id >= IPlugin::noId ? IPlugin::noId : static_cast<u32>(id);
}

/// Makes an object at a place of the list; of an unknown type a dummy, which is reported.
ref<IPlugin> createStored(PluginFactory& factory, name_id type, u32 id);

} // namespace base
