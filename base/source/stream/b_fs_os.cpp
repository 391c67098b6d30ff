#include "b_fs_os.h"

#include "b_format.h"
#include "b_worker_table.h"

#include <algorithm>
#include <cerrno>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <fcntl.h>
#include <filesystem>
#include <sys/stat.h>
#include <unistd.h>

namespace base::fs {

namespace {

namespace stdfs = std::filesystem;

constexpr u32 packedMode = 128;         ///< bit of the open mode for compressed files
constexpr u32 fileCapabilities = 652;   ///< besides reading and writing
constexpr u64 maxTransfer = 0x7ffff000; ///< what the system moves in one call at most

[[noreturn]] void throwSystemError(string_view action, string_view path, int code,
                                   const char* function, int line) {
    // Not `strerror`, whose text follows the locale.
    const char* reason = strerrordesc_np(code);
    throw api_exception(format("Can't {} '{}': {}", action, path, reason ? reason : "?"), code,
                        "b_fs", function, line);
}

/// Repeats a system call that a signal interrupted.
template <class Call>
auto uninterrupted(Call call) {
    auto result = call();
    while (result < 0 && errno == EINTR)
        result = call();
    return result;
}

bool hasZeroByte(string_view path) {
    return path.find('\0') != string_view::npos;
}

/// The system would take the text up to its zero byte for the path, and act on another file.
void requirePath(const string& path, const char* function) {
    if (hasZeroByte(path))
        throw invalid_argument("file name with a zero byte", "b_fs", function, __LINE__);
}

int openFlags(u32 mode) {
    const bool reads = (mode & openRead) != 0;
    const bool writes = (mode & openWrite) != 0;
    int flags = O_CLOEXEC | O_NOCTTY;
    flags |= !writes ? O_RDONLY : reads ? O_RDWR : O_WRONLY;
    if ((mode & openCreate) != 0 || (writes && !reads))
        flags |= O_CREAT;
    if ((mode & openTruncate) != 0)
        flags |= O_TRUNC;
    return flags;
}

/// Opens what is not a folder; throws as `MasterFS::open` says.
FileHandle openFile(const string& path, u32 mode) {
    constexpr const char* function = "base::fs::WinPlugin::open";
    const u32 access = mode & (openRead | openWrite);
    const auto fail = [&](int code) { throwSystemError("open", path, code, function, __LINE__); };
    // Cutting a file that is opened for reading is left undefined by the system.
    if (access == 0 || ((mode & openTruncate) != 0 && (mode & openWrite) == 0))
        fail(EINVAL);
    FileHandle file(uninterrupted([&] { return ::open(path.c_str(), openFlags(mode), 0666); }));
    if (file.get() < 0) {
        const int code = errno;
        const bool expectsFile = (mode & openRead) != 0 && (mode & openCreate) == 0;
        if (expectsFile && (code == ENOENT || code == ENOTDIR))
            throw file_not_found(path, "b_fs", function, __LINE__);
        fail(code);
    }
    struct stat status {};
    if (fstat(file.get(), &status) != 0)
        fail(errno);
    if (S_ISDIR(status.st_mode))
        fail(EISDIR);
    posix_fadvise(file.get(), 0, 0, POSIX_FADV_SEQUENTIAL);
    return file;
}

/// Matches a whole name; `?` takes one UTF-8 character.
bool matchesPattern(string_view name, string_view pattern) {
    constexpr std::size_t none = string_view::npos;
    std::size_t n = 0, p = 0, starPattern = none, starName = 0;
    while (n < name.size()) {
        if (p < pattern.size() && pattern[p] == '*') {
            starPattern = ++p;
            starName = n;
        } else if (p < pattern.size() && pattern[p] == '?') {
            ++p;
            do
                ++n;
            while (n < name.size() && (static_cast<u8>(name[n]) & 0xC0) == 0x80);
        } else if (p < pattern.size() && pattern[p] == name[n]) {
            ++p;
            ++n;
        } else if (starPattern != none) {
            // Let the last star take one byte more.
            p = starPattern;
            n = ++starName;
        } else {
            return false;
        }
    }
    return pattern.find_first_not_of('*', p) == none;
}

vector<string> listFolder(const string& folder, const string& pattern, bool folders) {
    vector<string> names;
    if (hasZeroByte(folder))
        return names;
    std::error_code error;
    stdfs::directory_iterator at(folder.empty() ? "." : folder, error);
    for (; !error && at != stdfs::directory_iterator(); at.increment(error)) {
        string name = at->path().filename().string();
        std::error_code unknown;
        if (matchesPattern(name, pattern) && at->is_directory(unknown) == folders)
            names.push_back(std::move(name));
    }
    std::sort(names.begin(), names.end());
    return names;
}

} // namespace

FileHandle::~FileHandle() {
    if (descriptor_ >= 0)
        ::close(descriptor_);
}

WinStreamWorker::WinStreamWorker(FileHandle file, string path, u32 access)
    : StreamWorker(std::move(path), fileCapabilities |
                                        ((access & openRead) != 0 ? streamReadable : 0u) |
                                        ((access & openWrite) != 0 ? streamWritable : 0u)),
      file_(std::move(file)) {
    const StreamOperations unset = operations;
    bindOperations(*this);
    if ((capabilities & streamReadable) == 0)
        operations.read = unset.read;
    if ((capabilities & streamWritable) == 0) {
        operations.write = unset.write;
        operations.setSize = unset.setSize;
    }
}

u64 WinStreamWorker::read(void* destination, u64 byteCount) {
    u64 done = 0;
    while (done < byteCount) {
        const ssize_t got = uninterrupted([&] {
            return ::read(file_.get(), static_cast<u8*>(destination) + done,
                          std::min(byteCount - done, maxTransfer));
        });
        if (got < 0)
            throwSystemError("read", name, errno, "base::fs::WinPlugin::readFile", __LINE__);
        if (got == 0)
            break;
        done += static_cast<u64>(got);
    }
    return done;
}

u64 WinStreamWorker::write(const void* source, u64 byteCount) {
    u64 done = 0;
    while (done < byteCount) {
        const ssize_t put = uninterrupted([&] {
            return ::write(file_.get(), static_cast<const u8*>(source) + done,
                           std::min(byteCount - done, maxTransfer));
        });
        // A full or faulty disk is told by the count; the handle's flags decide what follows.
        if (put <= 0)
            break;
        done += static_cast<u64>(put);
    }
    return done;
}

u64 WinStreamWorker::setPosition(i64 offset, StreamOrigin origin) {
    constexpr const char* function = "base::fs::WinPlugin::setFilePosition";
    const u64 size = getSize();
    const u64 current = origin == StreamOrigin::current ? getPosition() : 0;
    return seek(std::min(seekTarget(offset, origin, {0, current, size}, function), size));
}

u64 WinStreamWorker::seek(u64 position) {
    const off_t at = lseek(file_.get(), static_cast<off_t>(position), SEEK_SET);
    if (at < 0)
        throwSystemError("set the position in", name, errno, "base::fs::WinPlugin::setFilePosition",
                         __LINE__);
    return static_cast<u64>(at);
}

u64 WinStreamWorker::getPosition() {
    const off_t at = lseek(file_.get(), 0, SEEK_CUR);
    if (at < 0)
        throwSystemError("get the position in", name, errno, "base::fs::WinPlugin::fileGetPosition",
                         __LINE__);
    return static_cast<u64>(at);
}

u64 WinStreamWorker::getSize() {
    struct stat status {};
    if (fstat(file_.get(), &status) != 0)
        throwSystemError("get the size of", name, errno, "base::fs::WinPlugin::fileGetSize",
                         __LINE__);
    return static_cast<u64>(status.st_size);
}

void WinStreamWorker::setSize(u64 size) {
    const off_t length = static_cast<off_t>(std::min(size, u64{LLONG_MAX}));
    if (uninterrupted([&] { return ftruncate(file_.get(), length); }) != 0)
        throwSystemError("set the size of", name, errno, "base::fs::WinPlugin::fileTrunc",
                         __LINE__);
    if (getPosition() > size)
        seek(size);
}

bool WinStreamWorker::atEnd() {
    return getPosition() >= getSize();
}

void WinStreamWorker::flush() {
    const int result = uninterrupted([&] { return fdatasync(file_.get()); });
    // Pipes and devices have no storage to wait for.
    if (result != 0 && errno != EINVAL && errno != EROFS)
        throwSystemError("flush", name, errno, "base::fs::WinPlugin::fileFlush", __LINE__);
}

void WinStreamWorker::close() {
    // After an interrupted close the descriptor is free all the same.
    if (::close(file_.detach()) != 0 && errno != EINTR)
        throwSystemError("close", name, errno, "base::fs::WinPlugin::fileClose", __LINE__);
}

Stream WinStreamWorker::clone() {
    // By way of the descriptor, since the file may have been renamed or removed meanwhile.
    const u32 access = capabilities & (streamReadable | streamWritable);
    const int flags = access == streamReadable   ? O_RDONLY
                      : access == streamWritable ? O_WRONLY
                                                 : O_RDWR;
    const string path = format("/proc/self/fd/{}", file_.get());
    FileHandle file(uninterrupted([&] { return ::open(path.c_str(), flags | O_CLOEXEC); }));
    if (file.get() < 0)
        throwSystemError("clone", name, errno, "base::fs::WinPlugin::fileClone", __LINE__);
    return Stream(new WinStreamWorker(std::move(file), name, access));
}

WinPlugin::~WinPlugin() = default;

bool WinPlugin::owns(const string&) {
    return true;
}

void WinPlugin::open(Stream& stream, const string& path, u32 mode) {
    constexpr const char* function = "base::fs::WinPlugin::open";
    requirePath(path, function);
    if ((mode & packedMode) != 0)
        throw unsupported_interface("b_fs", function, __LINE__);
    stream = Stream(new WinStreamWorker(openFile(path, mode), path, mode));
}

bool WinPlugin::exists(const string& path) {
    struct stat status {};
    return !hasZeroByte(path) && stat(path.c_str(), &status) == 0;
}

bool WinPlugin::remove(const string& path, u32) {
    return !hasZeroByte(path) && std::remove(path.c_str()) == 0;
}

void WinPlugin::rename(const string& from, const string& to) {
    constexpr const char* function = "base::fs::WinPlugin::rename";
    requirePath(from, function);
    requirePath(to, function);
    if (std::rename(from.c_str(), to.c_str()) != 0)
        throwSystemError("rename", from, errno, function, __LINE__);
}

void WinPlugin::copy(const string& from, const string& to) {
    constexpr const char* function = "base::fs::WinPlugin::copy";
    requirePath(from, function);
    requirePath(to, function);
    std::error_code error;
    // Refuses to copy a file onto itself, which cutting the target first would empty.
    stdfs::copy_file(from, to, stdfs::copy_options::overwrite_existing, error);
    if (error)
        throwSystemError("copy", from, error.value(), function, __LINE__);
}

string WinPlugin::readLink(const string& path) {
    constexpr const char* function = "base::fs::WinPlugin::readLink";
    requirePath(path, function);
    std::error_code error;
    const stdfs::path target = stdfs::read_symlink(path, error);
    if (error)
        throwSystemError("read the link", path, error.value(), function, __LINE__);
    return target.string();
}

void WinPlugin::mkdir(const string& path) {
    constexpr const char* function = "base::fs::WinPlugin::mkdir";
    requirePath(path, function);
    std::error_code error;
    stdfs::create_directory(path, error);
    if (error)
        throwSystemError("make the folder", path, error.value(), function, __LINE__);
}

string WinPlugin::curdir() {
    std::error_code error;
    const stdfs::path current = stdfs::current_path(error);
    if (error)
        throwSystemError("get the current folder", "", error.value(), "base::fs::WinPlugin::curdir",
                         __LINE__);
    return joined(current.string(), "");
}

vector<string> WinPlugin::findFiles(const string& folder, const string& pattern) {
    return listFolder(folder, pattern, false);
}

vector<string> WinPlugin::findFolders(const string& folder, const string& pattern) {
    return listFolder(folder, pattern, true);
}

bool WinPlugin::symbolicLinks() {
    return true;
}

void WinPlugin::touch(const string& path) {
    constexpr const char* function = "base::fs::WinPlugin::touch";
    requirePath(path, function);
    if (utimensat(AT_FDCWD, path.c_str(), nullptr, 0) == 0)
        return;
    if (errno != ENOENT)
        throwSystemError("touch", path, errno, function, __LINE__);
    openFile(path, openWrite | openCreate);
}

WinPluginDesc::WinPluginDesc() {
    type = nameServer().id("WinPlugin");
    version = 1;
}

base::IPlugin* WinPluginDesc::create(PluginFactory& factory, u32 id) {
    return new WinPlugin(ref<IPluginDesc>(this), &factory, id);
}

string tmpPath() {
    const char* variable = std::getenv("TMPDIR");
    const string path = joined(variable && *variable ? variable : "/tmp", "");
    struct stat status {};
    const int code = stat(path.c_str(), &status) != 0 ? errno : 0;
    if (code != 0 || !S_ISDIR(status.st_mode))
        throw api_exception("Can't get the temp folder", code != 0 ? code : ENOTDIR, "b_fs",
                            "base::fs::tmpPath", __LINE__);
    return path;
}

string tmpFilename(const string& folder, const string& prefix) {
    string path = joined(master().resolve(folder), "") + prefix + "XXXXXX";
    const FileHandle file(mkostemp(path.data(), O_CLOEXEC));
    if (file.get() < 0)
        throw api_exception("Can't get a temp file name", errno, "b_fs", "base::fs::tmpFilename",
                            __LINE__);
    return path;
}

string moduleFolder() {
    std::error_code error;
    const stdfs::path program = stdfs::read_symlink("/proc/self/exe", error);
    if (error)
        throw api_exception("Can't get the folder of the program", error.value(), "b_fs",
                            "base::fs::moduleFolder", __LINE__);
    return folder(program.string());
}

} // namespace base::fs
