#include "stream/b_fs.h"

#include "b_format.h"
#include "b_fs_os.h"

namespace base::fs {

namespace {

[[noreturn]] void throwNotOffered(const char* operation) {
    throw exception(format("{} is not supported by this file system", operation), "b_fs", operation,
                    __LINE__);
}

} // namespace

file_not_found::file_not_found(const string& path, const char* file, const char* function, int line)
    : exception("File '" + path + "' cannot be found!", file, function, line) {}

file_not_found::~file_not_found() = default;

IPlugin::~IPlugin() = default;

bool IPlugin::remove(const string&, u32) {
    throwNotOffered("fs::Plugin::remove");
}

void IPlugin::rename(const string&, const string&) {
    throwNotOffered("fs::Plugin::rename");
}

void IPlugin::copy(const string&, const string&) {
    throwNotOffered("fs::Plugin::copy");
}

string IPlugin::readLink(const string&) {
    throwNotOffered("fs::Plugin::readLink");
}

void IPlugin::mkdir(const string&) {
    throwNotOffered("fs::Plugin::mkdir");
}

string IPlugin::curdir() {
    throwNotOffered("fs::Plugin::curdir");
}

bool IPlugin::symbolicLinks() {
    throwNotOffered("fs::Plugin::symbolicLinks");
}

void IPlugin::touch(const string&) {
    throwNotOffered("fs::Plugin::touch");
}

/// Makes the master itself, so that it is an object of its factory like every file system.
class MasterPluginDesc final : public IPluginDesc {
public:
    MasterPluginDesc() {
        type = nameServer().id("MasterPlugin");
        version = 1;
    }
    base::IPlugin* create(PluginFactory& factory, u32 id) override {
        return new MasterFS(ref<IPluginDesc>(this), factory, id);
    }
};

MasterFS::MasterFS(ref<IPluginDesc> desc, PluginFactory& factory, u32 id)
    : IPlugin(std::move(desc), &factory, id) {}

MasterFS::~MasterFS() = default;

bool MasterFS::owns(const string&) {
    return true;
}

void MasterFS::open(Stream& stream, const string& path, u32 mode) {
    const string resolved = resolve(path);
    if (resolved.empty())
        throw invalid_argument("file name not provided", "b_fs", "base::fs::MasterFS::open",
                               __LINE__);
    owner(resolved).open(stream, resolved, mode);
}

bool MasterFS::exists(const string& path) {
    const string resolved = resolve(path);
    return owner(resolved).exists(resolved);
}

bool MasterFS::remove(const string& path, u32 flags) {
    const string resolved = resolve(path);
    return owner(resolved).remove(resolved, flags);
}

void MasterFS::rename(const string& from, const string& to) {
    const string source = resolve(from);
    const string target = resolve(to);
    commonOwner(source, target, "base::fs::MasterFS::rename").rename(source, target);
}

void MasterFS::copy(const string& from, const string& to) {
    const string source = resolve(from);
    const string target = resolve(to);
    commonOwner(source, target, "base::fs::MasterFS::copy").copy(source, target);
}

string MasterFS::readLink(const string& path) {
    const string resolved = resolve(path);
    return owner(resolved).readLink(resolved);
}

void MasterFS::mkdir(const string& path) {
    const string resolved = resolve(path);
    owner(resolved).mkdir(resolved);
}

string MasterFS::curdir() {
    return owner({}).curdir();
}

vector<string> MasterFS::findFiles(const string& folder, const string& pattern) {
    const string resolved = resolve(folder);
    return owner(resolved).findFiles(resolved, pattern);
}

vector<string> MasterFS::findFolders(const string& folder, const string& pattern) {
    const string resolved = resolve(folder);
    return owner(resolved).findFolders(resolved, pattern);
}

bool MasterFS::symbolicLinks() {
    return owner({}).symbolicLinks();
}

void MasterFS::touch(const string& path) {
    const string resolved = resolve(path);
    owner(resolved).touch(resolved);
}

void MasterFS::attachFS(const string& name) {
    constexpr const char* function = "base::fs::MasterFS::attachFS";
    const name_id type = nameServer().id(name);
    if (type.isEmpty())
        throw exception("trying to create fs::Plugin with invaild id", "b_fs", function, __LINE__);
    ref<base::IPlugin> made;
    if (factory().hasDesc(type))
        made = factory().create(type);
    auto* fileSystem = dynamic_cast<IPlugin*>(made.get());
    if (!fileSystem)
        throw exception(format("file system with name {} can't be found", name), "b_fs", function,
                        __LINE__);
    attached_.push_back(fileSystem);
}

IPlugin& MasterFS::owner(const string& path) {
    // The operating system's file system, attached first, owns what no other one claims.
    std::size_t i = attached_.size() - 1;
    while (i > 0 && !attached_[i]->owns(path))
        --i;
    return *attached_[i];
}

IPlugin& MasterFS::commonOwner(const string& from, const string& to, const char* function) {
    IPlugin& source = owner(from);
    if (&source != &owner(to))
        throw unsupported_interface("b_fs", function, __LINE__);
    return source;
}

MasterFS& master() {
    static MasterFS& instance = []() -> MasterFS& {
        // Kept to the end of the process: files are opened until the last moment.
        auto& factory = *new PluginFactory("file systems");
        const ref<IPluginDesc> desc = makeRef<MasterPluginDesc>();
        factory.registerDesc(desc);
        factory.registerDesc(makeRef<WinPluginDesc>());
        auto& made = static_cast<MasterFS&>(*factory.create(desc->type));
        made.attachFS("WinPlugin");
        return made;
    }();
    return instance;
}

Stream createFile(const string& path) {
    Stream stream;
    master().open(stream, path, openReplace);
    stream.setFlags(stream.flags() | streamThrowOnShortWrite);
    return stream;
}

void writeFile(const string& path, const void* data, u64 byteCount) {
    Stream stream = createFile(path);
    stream.write(data, byteCount);
    stream.close();
}

} // namespace base::fs
