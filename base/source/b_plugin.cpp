#include "b_factory.h"

namespace base {

IPluginInterface::~IPluginInterface() = default;

IPlugin* IPluginInterface::plugin() {
    return nullptr;
}

IPluginDesc::IPluginDesc() : type(nameServer().id("Plugin")) {}

IPluginDesc::~IPluginDesc() = default;

void IPluginDesc::registerOptions(CmdLineOptions&) {}

DummyPluginDesc::DummyPluginDesc(name_id type) {
    this->type = type;
    version = dummyVersion;
}

DummyPluginDesc::~DummyPluginDesc() = default;

IPlugin* DummyPluginDesc::create(PluginFactory& factory, u32 id) {
    return new IPlugin(ref<IPluginDesc>(this), &factory, id);
}

struct IPlugin::InterfaceNode {
    IPluginInterface* added;
    InterfaceNode* next;
};

IPlugin::IPlugin(ref<IPluginDesc> desc, PluginFactory* factory, u32 id)
    : AttribMap(factory ? factory->attributeFactory() : attribFactory()), desc_(std::move(desc)),
      factory_(factory), id_(id) {
    if (factory_)
        factory_->enlist(*this);
}

IPlugin::~IPlugin() {
    if (factory_)
        factory_->delist(*this);
    while (interfaces_)
        delete std::exchange(interfaces_, interfaces_->next);
}

Attribute* IPlugin::clone() const {
    const ref<IPlugin> made =
        desc_ && factory_ ? factory_->create(desc_->type, createNoDummy | createLocked) : nullptr;
    if (!made)
        return AttribMap::clone();
    made->setFlags(flags());
    made->assign(*this, assignAdopt);
    return made.get();
}

string IPlugin::toString() const {
    return getName();
}

name_id IPlugin::typeName() const {
    return desc_ ? desc_->type : name_id();
}

IPluginInterface* IPlugin::queryInterface(name_id name) {
    for (const InterfaceNode* node = interfaces_; node; node = node->next)
        if (node->added->name() == name)
            return node->added;
    return nullptr;
}

void IPlugin::markCreated() {
    setFlags(flags() | attribPluginMark);
}

void IPlugin::afterLoad(i32) {}

void IPlugin::resolveLinks() {}

void IPlugin::beforeLink(const AttribPath&) {}

void IPlugin::reservedOperation() {}

void IPlugin::addInterface(IPluginInterface* added) {
    interfaces_ = new InterfaceNode{added, interfaces_};
}

string IPlugin::getName() const {
    static const name_id nameOfName = nameServer().id("name");
    const string* text = findAttribute<string>(nameOfName);
    return text ? *text : string();
}

void IPlugin::destroy() {
    static thread_local IPlugin* waiting = nullptr;
    static thread_local bool deleting = false;
    // No path may find an object that nobody holds.
    clearWeakLinks();
    nextDying_ = waiting;
    waiting = this;
    if (deleting)
        return;
    deleting = true;
    while (IPlugin* dying = waiting) {
        waiting = dying->nextDying_;
        delete dying;
    }
    deleting = false;
}

bool isDummy(const IPlugin& plugin) {
    return plugin.desc() && plugin.desc()->version < 0;
}

PluginCallback::~PluginCallback() = default;

void PluginCallback::changed(u32, const AttribPath&) {}

void PluginCallback::added(PluginFactory&, u32) {}

void PluginCallback::removed(PluginFactory&, u32) {}

void PluginCallback::cleared(PluginFactory&) {}

} // namespace base
