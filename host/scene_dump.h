#pragma once

#include "b_factory.h"

namespace host {

/// The scene as text for people: every object with its attributes, below the one that refers to it
/// first. Attributes that are never stored are left out, long arrays are told by their length.
base::string sceneText(const base::PluginFactory& scene);

} // namespace host
