#pragma once

/// Marks the classes of `scene` that are recognised across module borders. Their type information
/// is weak and visible, so that the modules of a process may share it; where a plugin hides its
/// copy, the classes are told by their names.
#define SCENE_API __attribute__((visibility("default")))
