#pragma once

#include "b_factory.h"
#include "stream/b_stream.h"
#include "b_exception.h"

/// One view of all file systems. Paths are UTF-8; slash and backslash both separate folders.
namespace base::fs {

/// Bits of an open mode, as mask values.
enum OpenMode : u32 {
    openRead = 1,
    openWrite = 2, ///< alone (without `openRead`) it also creates
    openShareRead = 4,
    openShareWrite = 8,
    openCreate = 32,
    openTruncate = 64,
    openReplace = 0x62, ///< write, create, cut: what a file is exported with
};

class BASE1_API file_not_found : public exception {
public:
    explicit file_not_found(const string& path, const char* file = nullptr,
                            const char* function = nullptr, int line = 0);
    ~file_not_found() override;
};

/// A file system. What a derived one does not offer throws `exception` naming the operation.
class BASE1_API IPlugin : public base::IPlugin {
public:
    using base::IPlugin::IPlugin;
    ~IPlugin() override;
    virtual void open(Stream& stream, const string& path, u32 mode);
    virtual bool exists(const string& path);
    /// True only if something was removed; never throws for a file that resists.
    virtual bool remove(const string& path, u32 flags = 0);
    virtual void rename(const string& from, const string& to);
    virtual void copy(const string& from, const string& to);
    virtual string readLink(const string& path);
    virtual void mkdir(const string& path);
    virtual string curdir();
    /// Names (without folder) of the entries of `folder` that match `pattern`, where `*` stands
    /// for any characters and `?` for one; sorted by bytes. Empty if the folder can't be read.
    virtual vector<string> findFiles(const string& folder, const string& pattern);
    virtual vector<string> findFolders(const string& folder, const string& pattern);
    virtual bool symbolicLinks();
    virtual void touch(const string& path);
};

/// The first components of paths that stand for others. A name holds with or without ":".
class BASE1_API Aliases {
public:
    void set(const string& name, const string& replacement);
    bool remove(const string& name);
    /// `path` with its first component replaced, again at most 16 times.
    string resolve(string path) const;

private:
    map<string, string> names_;
};

/// Sends each request to the file system that owns the path.
class BASE1_API MasterFS final : public IPlugin {
public:
    ~MasterFS() override;
    /// Opens a file; `mode` is made of `OpenMode` bits. Throws `invalid_argument` for an empty
    /// path, `file_not_found` for a missing file in read mode, `api_exception` for all else that
    /// the system refuses.
    void open(Stream& stream, const string& path, u32 mode) override;
    bool exists(const string& path) override;
    bool remove(const string& path, u32 flags = 0) override;
    void rename(const string& from, const string& to) override;
    void copy(const string& from, const string& to) override;
    string readLink(const string& path) override;
    void mkdir(const string& path) override;
    string curdir() override;
    vector<string> findFiles(const string& folder, const string& pattern) override;
    vector<string> findFolders(const string& folder, const string& pattern) override;
    bool symbolicLinks() override;
    void touch(const string& path) override;

    /// Joins a file system by the type name of its description.
    void attachFS(const string& name);
    PluginFactory& factory() noexcept { return factory_; }
    /// The path as the file systems see it: "file://" taken off, backslashes turned, aliases
    /// replaced.
    string resolve(const string& path) const;

private:
    friend BASE1_API MasterFS& master();
    MasterFS(PluginFactory& factory);
    IPlugin& owner(const string& path);
    PluginFactory& factory_;
    vector<ref<base::IPlugin>> attached_;
};

BASE1_API MasterFS& master();
BASE1_API Aliases& aliases();

/// The system's temporary folder, with a separator at its end.
BASE1_API string tmpPath();
/// Makes a unique empty file in `folder` and returns its full path.
BASE1_API string tmpFilename(const string& folder, const string& prefix = "tmp");
/// The folder of the running program, with a separator at its end.
BASE1_API string moduleFolder();

// Parts of a path.

/// Up to and including the last separator; empty without one.
BASE1_API string folder(string_view path);
/// Behind the last separator.
BASE1_API string fileName(string_view path);
/// The file name without the extension that starts at its (n+1)th dot from the end; with fewer
/// dots, at its first one.
BASE1_API string stem(string_view path, u32 n = 0);
/// What stands behind that dot; empty without one.
BASE1_API string extension(string_view path, u32 n = 0);
/// Turns backslashes into slashes and collapses "//", "." and "..".
BASE1_API string normalized(string_view path);
/// `folder` and `name` with exactly one separator between them; `name` alone if it is absolute.
BASE1_API string joined(string_view folder, string_view name);
BASE1_API bool isAbsolute(string_view path);

} // namespace base::fs
