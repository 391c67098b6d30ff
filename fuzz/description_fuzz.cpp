#include "require.h"

#include "b_attribute_desc.h"
#include "b_exception.h"
#include "b_log.h"

#include <cstdint>

/// Reads any bytes as a description file. What it describes must be found again, its relations
/// must agree with each other, and a second file must not change it.
namespace {

using namespace base;

/// False for what is no XML.
bool load(AttribDescManager& manager, const string& text) {
    try {
        manager.loadText(text, "input.xml");
        return true;
    } catch (const exception&) {
        return false;
    }
}

void checkType(const AttribDescManager& manager, name_id type) {
    const AttribMapDesc* desc = manager.find(type);
    require(desc && desc->name == type, "a type that can't be found");
    require(manager.derivesFrom(type, type), "a type that is not itself");
    require(!desc->inherit || manager.derivesFrom(type, desc->inherit), "a lost base");
    for (const ref<const AttribDesc>& attribute : desc->attributes) {
        if (!attribute->name)
            continue;
        const ref<const AttribDesc> found = desc->find(attribute->name);
        require(found && found->name == attribute->name, "an attribute that can't be found");
        require(desc->control(attribute->name) == found->control || !found->control,
                "another control");
    }
}

} // namespace

extern "C" int LLVMFuzzerInitialize(int*, char***) {
    log().setLevelLimit(logText);
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const string text(reinterpret_cast<const char*>(data), size);
    // A type to ask the other ones by: every described type may name it as its base.
    const name_id base = nameServer().id("base");
    AttribDescManager manager;
    const bool isRead = load(manager, text);
    const vector<name_id> derived = manager.derived(base);
    require(isRead || derived.empty(), "types of a file that was refused");
    vector<const AttribMapDesc*> before;
    for (const name_id type : derived) {
        require(manager.derivesFrom(type, base), "a derived type that does not derive");
        checkType(manager, type);
        before.push_back(manager.find(type));
    }
    require(load(manager, text) == isRead, "another answer to the same text");
    for (const AttribMapDesc* desc : std::as_const(before))
        require(manager.find(desc->name) == desc, "a type that was described anew");
    return 0;
}
