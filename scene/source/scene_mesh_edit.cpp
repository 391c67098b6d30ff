#include "scene_mesh_edit.h"

namespace scene {

using base::AttribMap;
using base::Attribute;
using base::name_id;

void MeshEdit::replace(AttribMap& owner, name_id name, std::unique_ptr<Attribute> fresh) {
    const Attribute* old = owner.findAttribute(name, false, false);
    if (old && !old->asLink())
        fresh->setFlags(fresh->flags() | old->flags());
    replacements_.push_back({&owner, name, std::move(fresh)});
}

void MeshEdit::erase(AttribMap& owner, name_id name) {
    erasures_.push_back({&owner, name});
}

void MeshEdit::commit() {
    for (Replacement& change : replacements_) {
        change.owner->removeAttribute(change.name);
        change.owner->attribute(change.name, change.fresh.get());
        change.fresh.release();
    }
    for (const auto& [owner, name] : erasures_) {
        owner->removeAttribute(name);
        if (const Attribute* inherited = owner->findAttribute(name))
            owner->attribute(name, owner->factory().create(inherited->type()));
    }
    replacements_.clear();
    erasures_.clear();
}

} // namespace scene
