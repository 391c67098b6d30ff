#include "b_stored_document.h"

namespace base {

namespace {

/// Takes over attributes, the stored flags and the type, if there is one.
void addAttributes(AttribMap& target, const AttribMap& read) {
    target.assign(read, assignAdopt);
    target.setFlags((target.flags() & ~storedFlags) | (read.flags() & storedFlags));
    if (!read.typeName().isEmpty())
        target.setTypeName(read.typeName());
}

} // namespace

bool isStored(const Attribute& attribute) {
    if (attribute.hasFlag(attribTransient))
        return false;
    const AttribLink* link = attribute.asLink();
    const IPlugin* root = link ? link->path().root() : nullptr;
    return !root || !root->hasFlag(attribTransient);
}

ref<IPlugin> createStored(PluginFactory& factory, name_id type, u32 id) {
    if (!factory.hasDesc(type)) {
        log().log(logSystem, logWarning,
                  "plugin factory| Unsupported plugin type {}! Objects of this type will have "
                  "limited functionality.",
                  type);
        factory.create(type, createLoose); // makes the description; the list does without
    }
    return factory.createAt(type, id);
}

void PluginFactory::readDocument(StoredDocument& document, i32 version) {
    const u32 firstId = pluginCount();
    const std::size_t dummiesBefore = dummyDescs_.size();
    std::unique_ptr<Attribute> attributesBefore;
    try {
        plugins_.resize(firstId + document.objectCount());
        document.createObjects();
        document.readObjects();
        if (const std::unique_ptr<AttribMap> read = document.readAttributes()) {
            attributesBefore.reset(attributes_.clone());
            addAttributes(attributes_, *read);
        }
        afterLoadAll(version, firstId);
    } catch (...) {
        if (attributesBefore) {
            attributes_.clear();
            attributes_.setTypeName({});
            addAttributes(attributes_, *attributesBefore->asMap());
        }
        for (u32 id = firstId; id < pluginCount(); ++id) {
            if (const ref<IPlugin> object = plugin(id)) {
                object->clear(); // their references to each other
                remove(id, true);
            }
        }
        plugins_.resize(firstId);
        for (std::size_t i = dummiesBefore; i < dummyDescs_.size(); ++i)
            unregisterDesc(std::as_const(dummyDescs_)[i]);
        dummyDescs_.resize(dummiesBefore);
        throw;
    }
}

} // namespace base
