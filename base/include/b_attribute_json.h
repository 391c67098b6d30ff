#pragma once

#include "b_attribute.h"

/// The JSON form of attributes: its writer and its reader.
namespace base {} // namespace base
