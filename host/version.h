#pragma once

#include "scene_factory.h"

namespace host {

inline constexpr const char* programVersion = SCENE_EXPORT_VERSION;

/// The text of --version: the program, what the plugins of `factory` tell of themselves, and the
/// libraries that run in this process.
base::string versionText(const scene::SceneFactory& factory);

} // namespace host
