#pragma once

#include "b_exception.h"
#include "b_factory.h"
#include "stream/b_stream.h"

/// One view of all file systems. Paths are UTF-8; slash and backslash both separate folders.
namespace base::fs {

/// Bits of an open mode, as mask values. Without `openCreate` the file must exist.
enum OpenMode : u32 {
    openRead = 1,
    openWrite = 2,     ///< alone (without `openRead`) it also creates, and keeps what is there
    openShareRead = 4, ///< both shares are granted anyway
    openShareWrite = 8,
    openCreate = 32,
    openTruncate = 64,  ///< needs `openWrite`
    openReplace = 0x62, ///< write, create, cut: what a file is exported with
};

/// "File '" path "' cannot be found!"
class BASE1_API file_not_found : public exception {
public:
    explicit file_not_found(const string& path, const char* file = nullptr,
                            const char* function = nullptr, int line = 0);
    ~file_not_found() override;
};

/// A file system. Failures throw exceptions of the `base` family. What a derived one does not
/// offer throws `exception` naming the operation.
class BASE1_API IPlugin : public base::IPlugin {
public:
    using base::IPlugin::IPlugin;
    ~IPlugin() override;
    /// True if requests for `path` are this file system's.
    virtual bool owns(const string& path) = 0;
    /// Points `stream` at a new worker on the file; `mode` is made of `OpenMode` bits. `stream`
    /// stays as it was on a throw.
    virtual void open(Stream& stream, const string& path, u32 mode) = 0;
    virtual bool exists(const string& path) = 0;
    /// Removes a file or an empty folder. True only if something was removed; does not throw for
    /// what resists. `flags` are reserved.
    virtual bool remove(const string& path, u32 flags = 0);
    /// Replaces what is at `to`.
    virtual void rename(const string& from, const string& to);
    /// Copies a file, replacing what is at `to`.
    virtual void copy(const string& from, const string& to);
    /// What the symbolic link at `path` holds.
    virtual string readLink(const string& path);
    /// Makes one folder; no fault if it is there.
    virtual void mkdir(const string& path);
    /// The current folder, with a separator at its end.
    virtual string curdir();
    /// Names (without folder) of the entries of `folder` that match `pattern`, where `*` stands
    /// for any characters and `?` for one; sorted by bytes. Empty if the folder can't be read.
    virtual vector<string> findFiles(const string& folder, const string& pattern) = 0;
    virtual vector<string> findFolders(const string& folder, const string& pattern) = 0;
    /// True if the file system knows symbolic links.
    virtual bool symbolicLinks();
    /// Sets the time of change to now; makes an empty file where there is none.
    virtual void touch(const string& path);
};

/// Names that stand for folders as the first component of a path, with or without a ":" behind.
class BASE1_API Aliases {
public:
    /// An empty name is ignored.
    void set(const string& name, const string& replacement);
    /// False if there is no such alias.
    bool remove(const string& name);
    /// `path` with its first component replaced, again at most 16 times.
    string resolve(string path) const;

private:
    map<string, string> names_;
};

class MasterPluginDesc;

/// Sends each request to the file system that owns the path: the one attached last among those
/// that do. Read-only once the file systems are attached.
class BASE1_API MasterFS final : public IPlugin {
public:
    ~MasterFS() override;
    bool owns(const string& path) override;
    /// Throws `invalid_argument` for an empty path or one with a zero byte, `file_not_found` for
    /// a missing file in read mode, `api_exception` for all else that the system refuses.
    void open(Stream& stream, const string& path, u32 mode) override;
    bool exists(const string& path) override;
    bool remove(const string& path, u32 flags = 0) override;
    /// Both paths must belong to one file system, else `unsupported_interface`; so for `copy`.
    void rename(const string& from, const string& to) override;
    void copy(const string& from, const string& to) override;
    string readLink(const string& path) override;
    void mkdir(const string& path) override;
    string curdir() override;
    vector<string> findFiles(const string& folder, const string& pattern) override;
    vector<string> findFolders(const string& folder, const string& pattern) override;
    bool symbolicLinks() override;
    void touch(const string& path) override;

    /// Joins a file system by the type name of its description, which must be registered in
    /// `factory()`. Throws if it isn't.
    void attachFS(const string& name);
    PluginFactory& factory() noexcept { return *pluginFactory(); }
    /// The path as the file systems see it: "file://" taken off, alias replaced, normalised.
    string resolve(const string& path) const;

private:
    friend MasterPluginDesc;
    MasterFS(ref<IPluginDesc> desc, PluginFactory& factory, u32 id);
    IPlugin& owner(const string& path);
    IPlugin& commonOwner(const string& from, const string& to, const char* function);

    vector<ref<IPlugin>> attached_;
};

/// The one instance, with the operating system's file system attached.
BASE1_API MasterFS& master();
BASE1_API Aliases& aliases();

/// A stream on a new file in the place of what is at `path`; short writes throw. Throws as
/// `MasterFS::open`.
BASE1_API Stream createFile(const string& path);
/// Makes `byteCount` bytes the whole content of the file at `path`. Throws as `createFile`, and for
/// a short write.
BASE1_API void writeFile(const string& path, const void* data, u64 byteCount);

/// The system's temporary folder, with a separator at its end. Throws `api_exception` if there
/// is none.
BASE1_API string tmpPath();
/// Makes a unique empty file in `folder`, which only this user may read, and returns its full
/// path. Throws `api_exception` if it can't.
BASE1_API string tmpFilename(const string& folder, const string& prefix = "tmp");
/// The folder of the running program, with a separator at its end.
BASE1_API string moduleFolder();

// Parts of a path. Slash and backslash both separate.

/// Up to and including the last separator; empty without one.
BASE1_API string folder(string_view path);
/// Behind the last separator.
BASE1_API string fileName(string_view path);
/// The file name without the extension that starts at its (n+1)th dot from the end; with fewer
/// dots, at its first one.
BASE1_API string stem(string_view path, u32 n = 0);
/// What stands behind that dot; empty without one.
BASE1_API string extension(string_view path, u32 n = 0);
/// Turns backslashes into slashes and collapses "//", "." and "..". A leading or trailing slash
/// and leading ".."s stay. Only an empty path gives an empty one.
BASE1_API string normalized(string_view path);
/// `folder` and `name` with exactly one separator between them; `name` alone if it is absolute or
/// `folder` is empty.
BASE1_API string joined(string_view folder, string_view name);
/// True for a path that starts with a separator, with "file://" or with a folder that ends with
/// ":" (an alias, a drive).
BASE1_API bool isAbsolute(string_view path);

} // namespace base::fs
