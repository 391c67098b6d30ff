#pragma once

#include "b_attribute.h"

/// The binary form of attributes.
namespace base {} // namespace base
