#pragma once

#include "b_factory.h"

/// The documents that the rows of storing are measured with.
namespace bench {

/// Eight objects with three large arrays each, 160 MB in all.
base::ref<base::PluginFactory> makeArrayDocument();

/// 20,000 objects with a handful of small attributes each, as nodes have them.
base::ref<base::PluginFactory> makeNodeDocument();

} // namespace bench
