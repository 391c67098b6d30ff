#include "stream/b_stream.h"

#include "b_exception.h"
#include "b_format.h"
#include "b_log.h"

#include <algorithm>

namespace base {

namespace {

constexpr u64 copyBlockBytes = 256 * 1024; ///< for copies from stream to stream

template <class Result, class... Args>
using Operation = Result (*)(StreamWorker&, Args...);

template <class Result, class... Args>
Result unsupported(StreamWorker&, Args...) {
    throw unsupported_interface("b_stream", "base::StreamWorker", __LINE__);
}

/// Turns into the throwing function of whatever entry it is assigned to.
struct UnsupportedEntry {
    template <class Result, class... Args>
    operator Operation<Result, Args...>() const {
        return unsupported<Result, Args...>;
    }
};

void copyStream(Stream& source, Stream& target, const char* function) {
    if ((source.capabilities() & streamReadable) == 0 ||
        (target.capabilities() & streamWritable) == 0)
        throw unsupported_interface("b_stream", function, __LINE__);
    const u64 position = source.position();
    const u64 wanted = std::max(source.size(), position) - position;
    vector<u8> block;
    block.resizeUninitialized(std::min(wanted, copyBlockBytes));
    StreamWorker& from = *source.worker();
    StreamWorker& to = *target.worker();
    u64 written = 0;
    while (written < wanted) {
        const u64 count = std::min<u64>(block.size(), wanted - written);
        const u64 got = from.operations.read(from, block.data(), count);
        const u64 put = to.operations.write(to, block.data(), got);
        written += put;
        if (put < count)
            throw exception(format("trying to write {} bytes, written {} bytes", wanted, written),
                            "b_stream", function, __LINE__);
    }
}

} // namespace

StreamCoder::~StreamCoder() = default;

StreamWorker::StreamWorker(string workerName, u32 workerCapabilities)
    : capabilities(workerCapabilities), name(std::move(workerName)) {
    constexpr UnsupportedEntry entry;
    operations = {entry, entry, entry, entry, entry, entry,
                  entry, entry, entry, entry, entry, entry};
}

StreamWorker::~StreamWorker() = default;

Stream::Stream(const Stream& other) noexcept
    : worker_(other.worker_), state_{other.state_[0], other.state_[1]}, flags_(other.flags_) {
    if (worker_)
        worker_->handles_.fetch_add(1, std::memory_order_relaxed);
}

Stream::Stream(Stream&& other) noexcept
    : worker_(std::exchange(other.worker_, nullptr)), state_{other.state_[0], other.state_[1]},
      flags_(other.flags_) {}

Stream& Stream::operator=(Stream other) noexcept {
    std::swap(worker_, other.worker_);
    std::swap(state_, other.state_);
    std::swap(flags_, other.flags_);
    return *this;
}

Stream::~Stream() {
    close();
}

u64 Stream::read(void* destination, u64 byteCount) {
    const u64 got = worker_->operations.read(*worker_, destination, byteCount);
    if (got != byteCount && (flags_ & streamThrowOnShortRead) != 0)
        throw exception(
            format("stream '{}': trying to read {} bytes, read {} bytes", name(), byteCount, got),
            "b_stream", "base::Stream::read", __LINE__);
    return got;
}

u64 Stream::write(const void* source, u64 byteCount) {
    const u64 put = worker_->operations.write(*worker_, source, byteCount);
    if (put != byteCount && (flags_ & streamThrowOnShortWrite) != 0)
        throw exception(format("stream '{}': trying to write {} bytes, written {} bytes", name(),
                               byteCount, put),
                        "b_stream", "base::Stream::write", __LINE__);
    return put;
}

Stream Stream::clone() const {
    Stream copy = worker_->operations.clone(*worker_);
    if (worker_->coder)
        copy.worker_->coder.reset(worker_->coder->clone());
    return copy;
}

void Stream::close() noexcept {
    StreamWorker* worker = std::exchange(worker_, nullptr);
    if (!worker || worker->handles_.fetch_sub(1, std::memory_order_acq_rel) != 1)
        return;
    const auto logFault = [&] {
        log().log(logSystem, logError, "Unhandled exception while closing '{}'!", worker->name);
    };
    try {
        worker->operations.close(*worker);
    } catch (const exception& error) {
        logFault();
        error.report(log());
    } catch (...) {
        logFault();
    }
    delete worker;
}

Stream& Stream::operator>>(Stream& target) {
    copyStream(*this, target, "Stream::read->write");
    return *this;
}

Stream& Stream::operator<<(Stream& source) {
    copyStream(source, *this, "Stream::write->read");
    return *this;
}

} // namespace base
