#include "require.h"

#include "b_exception.h"
#include "b_factory.h"
#include "b_log.h"
#include "stream/b_stream_workers.h"

/// Reads any text as a document. What reads must write, read again, and write the same text.
namespace {

using namespace base;

bool readDocument(PluginFactory& factory, const void* text, std::size_t byteCount) {
    Stream stream = memStreamView(text, byteCount, "input");
    bool isRead = false;
    try {
        isRead = factory.readJson(stream);
    } catch (const exception&) {
        isRead = false;
    }
    require(isRead || factory.pluginCount() == 0, "objects left by a document that can't be read");
    return isRead;
}

string writeDocument(const PluginFactory& factory) {
    string text;
    Stream stream = stringStream(text);
    factory.writeJson(stream);
    return text;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    log().setLevelLimit(logWarning);
    PluginFactory factory, again;
    if (!readDocument(factory, data, size))
        return 0;
    const string first = writeDocument(factory);
    require(readDocument(again, first.data(), first.size()),
            "a written document that can't be read");
    require(writeDocument(again) == first, "another document than was read");
    return 0;
}
