#pragma once

#include "stream/b_fs.h"

/// The operating system's own files. "Win" is the framework's word for them on every system.
namespace base::fs {

/// Owns a file descriptor.
class FileHandle : public NonCopyable {
public:
    explicit FileHandle(int descriptor) noexcept : descriptor_(descriptor) {}
    FileHandle(FileHandle&& other) noexcept : descriptor_(other.detach()) {}
    ~FileHandle();
    int get() const noexcept { return descriptor_; }
    int detach() noexcept { return std::exchange(descriptor_, -1); }

private:
    int descriptor_;
};

/// The table of operations over one open file. Nothing is held back: a write has reached the
/// system when it returns.
class WinStreamWorker final : public StreamWorker {
public:
    /// `access` is made of `openRead` and `openWrite`.
    WinStreamWorker(FileHandle file, string path, u32 access);

    u64 read(void* destination, u64 byteCount);
    u64 write(const void* source, u64 byteCount);
    u64 setPosition(i64 offset, StreamOrigin origin);
    u64 getPosition();
    u64 getSize();
    void setSize(u64 size);
    bool atEnd();
    /// Waits until the storage has the data.
    void flush();
    void close();
    Stream clone();

private:
    u64 seek(u64 position);

    FileHandle file_;
};

class WinPlugin final : public IPlugin {
public:
    using IPlugin::IPlugin;
    ~WinPlugin() override;
    bool owns(const string& path) override;
    void open(Stream& stream, const string& path, u32 mode) override;
    bool exists(const string& path) override;
    bool remove(const string& path, u32 flags) override;
    void rename(const string& from, const string& to) override;
    void copy(const string& from, const string& to) override;
    string readLink(const string& path) override;
    void mkdir(const string& path) override;
    string curdir() override;
    vector<string> findFiles(const string& folder, const string& pattern) override;
    vector<string> findFolders(const string& folder, const string& pattern) override;
    bool symbolicLinks() override;
    void touch(const string& path) override;
};

class WinPluginDesc final : public IPluginDesc {
public:
    WinPluginDesc();
    base::IPlugin* create(PluginFactory& factory, u32 id) override;
};

} // namespace base::fs
