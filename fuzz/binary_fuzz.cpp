#include "require.h"

#include "b_exception.h"
#include "b_factory.h"
#include "b_log.h"
#include "stream/b_stream_workers.h"

/// Reads any bytes as a document. What reads must write, read again, and write the same bytes; and
/// a stream that checks short reads must not read more than one that does not.
namespace {

using namespace base;

bool readDocument(PluginFactory& factory, const vector<u8>& bytes, u32 flags) {
    Stream stream = memStreamView(bytes.data(), bytes.size(), "input");
    stream.setFlags(flags);
    bool isRead = false;
    try {
        isRead = factory.read(stream);
    } catch (const exception&) {
        isRead = false;
    }
    require(isRead || factory.pluginCount() == 0, "objects left by a document that can't be read");
    return isRead;
}

vector<u8> writeDocument(const PluginFactory& factory) {
    vector<u8> bytes;
    Stream stream = vectorStream(bytes);
    factory.write(stream);
    return bytes;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    log().setLevelLimit(logText);
    const vector<u8> bytes(data, data + size);
    constexpr u32 checked = streamInitialFlags | streamThrowOnShortRead;
    PluginFactory lenient, strict;
    const bool isRead = readDocument(lenient, bytes, streamInitialFlags);
    require(!readDocument(strict, bytes, checked) || isRead, "only the checked stream is read");
    if (!isRead)
        return 0;
    const vector<u8> first = writeDocument(lenient);
    PluginFactory again;
    require(readDocument(again, first, checked), "a written document that can't be read");
    require(writeDocument(again) == first, "another document than was read");
    return 0;
}
