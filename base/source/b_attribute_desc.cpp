#include "b_attribute_desc.h"

#include "b_attribute_desc_xml.h"
#include "b_exception.h"
#include "b_log.h"
#include "stream/b_fs.h"

#include <mutex>

namespace base {

namespace {

constexpr std::size_t greatestHops = 64; ///< of a chain, which wrong claims may close to a ring
constexpr u64 greatestFileBytes = u64{64} << 20;

string readFile(const string& path) {
    Stream stream;
    fs::master().open(stream, path, fs::openRead | fs::openShareRead);
    const u64 byteCount = stream.size();
    if (byteCount > greatestFileBytes)
        throw exception(format("The description file {} has {} bytes, more than the allowed {}",
                               path, byteCount, greatestFileBytes),
                        "b_attribute_desc", "base::AttribDescManager::load", __LINE__);
    string text(static_cast<std::size_t>(byteCount), '\0');
    stream.setFlags(stream.flags() | streamThrowOnShortRead);
    stream.read(text.data(), byteCount);
    return text;
}

} // namespace

AttribDesc::~AttribDesc() = default;
AttribMapDesc::~AttribMapDesc() = default;

ref<const AttribDesc> AttribMapDesc::find(name_id attribute) const {
    const AttribMapDesc* desc = this;
    for (std::size_t hops = 0; desc && hops <= greatestHops; ++hops) {
        const auto found = desc->attributesByName.find(attribute);
        if (found != desc->attributesByName.end())
            return found->second;
        desc = manager_->find(desc->inherit);
    }
    return nullptr;
}

name_id AttribMapDesc::control(name_id attribute) const {
    const ref<const AttribDesc> desc = find(attribute);
    if (!desc)
        return {};
    return desc->control ? desc->control : desc->typeName;
}

AttribDescManager::AttribDescManager() = default;
AttribDescManager::~AttribDescManager() = default;

void AttribDescManager::load(const string& path) {
    loadText(readFile(path), path);
}

void AttribDescManager::loadText(string text, const string& path) {
    AttribDescFile file = readAttribDescs(std::move(text), path, *this);
    vector<name_id> duplicates;
    {
        const std::lock_guard guard(lock_);
        for (const ref<AttribMapDesc>& desc : std::as_const(file.descs))
            if (!descs_.try_emplace(desc->name, desc).second)
                duplicates.push_back(desc->name);
        fileAttributes_ = std::move(file.attributes);
    }
    for (const name_id name : std::as_const(duplicates))
        log().log(logSystem, logError, "Duplicated property map name '{}' in file {}!", name, path);
}

void AttribDescManager::loadDirectory(const string& path) {
    const vector<string> names = fs::master().findFiles(path, "*.xml");
    for (const string& name : names)
        load(fs::joined(path, name));
}

AttribDescManager::FileAttributes AttribDescManager::fileAttributes() const {
    const std::shared_lock guard(lock_);
    return fileAttributes_;
}

const AttribMapDesc* AttribDescManager::described(name_id type) const {
    const auto found = descs_.find(type);
    return found == descs_.end() ? nullptr : found->second.get();
}

const AttribMapDesc* AttribDescManager::find(name_id type) const {
    const std::shared_lock guard(lock_);
    return described(type);
}

bool AttribDescManager::inherits(const AttribMapDesc& desc, name_id base) const {
    const AttribMapDesc* at = &desc;
    for (std::size_t hops = 0; at && at->inherit && hops < greatestHops; ++hops) {
        if (at->inherit == base)
            return true;
        at = described(at->inherit);
    }
    return false;
}

vector<name_id> AttribDescManager::derived(name_id type) const {
    vector<name_id> types;
    const std::shared_lock guard(lock_);
    for (const auto& [name, desc] : descs_)
        if (name != type && inherits(*desc, type))
            types.push_back(name);
    return types;
}

void AttribDescManager::addClass(name_id type, name_id base) {
    const std::lock_guard guard(lock_);
    classes_.try_emplace(type, base);
}

/// A type may have two bases, one from a file and one in the code.
bool AttribDescManager::derivesFrom(name_id type, name_id base) const {
    const std::shared_lock guard(lock_);
    name_id reached[greatestHops + 1] = {type};
    std::size_t count = 1;
    const auto reach = [&](name_id next) {
        name_id* const end = reached + count;
        if (next && count < std::size(reached) && std::find(reached, end, next) == end)
            reached[count++] = next;
    };
    for (std::size_t i = 0; i < count; ++i) {
        if (reached[i] == base)
            return true;
        if (const AttribMapDesc* desc = described(reached[i]))
            reach(desc->inherit);
        if (const auto known = classes_.find(reached[i]); known != classes_.end())
            reach(known->second);
    }
    return false;
}

AttribDescManager& attribDescManager() {
    // Never destroyed: other static objects may ask it until the end.
    static auto& manager = *new AttribDescManager;
    return manager;
}

} // namespace base
