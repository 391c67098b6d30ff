#pragma once

#include "b_attribute_map.h"

#include <memory>

namespace scene {

/// Changes to a mesh and its sets that are prepared one by one and made together, so that a mesh
/// is never left half rewritten.
class MeshEdit {
public:
    /// Puts `fresh` in the place of the attribute, whose flags it takes over. A link is cut, not
    /// followed: what it leads to may serve other meshes.
    void replace(base::AttribMap& owner, base::name_id name,
                 std::unique_ptr<base::Attribute> fresh);
    /// Makes an array read as absent or, where a parent map supplies it, as empty.
    void erase(base::AttribMap& owner, base::name_id name);
    void commit();

private:
    struct Replacement {
        base::AttribMap* owner;
        base::name_id name;
        std::unique_ptr<base::Attribute> fresh;
    };
    base::vector<Replacement> replacements_;
    base::vector<std::pair<base::AttribMap*, base::name_id>> erasures_;
};

} // namespace scene
