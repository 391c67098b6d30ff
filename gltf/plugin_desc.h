#pragma once

#include "b_factory.h"

namespace gltf {

/// Registers the schemas of the framework and the description of the exporter with `factory`.
/// What it knows already stays as it is.
void registerPlugin(base::PluginFactory& factory);

} // namespace gltf
