#pragma once

#include "b_attribute_map.h"

/// Following links, inside the library.
namespace base {

/// Links that one access follows, and parents that one look-up asks, at most. What is further
/// away counts as unresolved or absent, so that cycles end.
constexpr u32 maxLinkHops = 64;

/// Where `link` leads, one hop further; null if nowhere. If the target is missing or untracked,
/// the plugin at the root of the path is asked to bring it up to date and the path resolved once
/// more. `hopsLeft` is shared by all links of an access, those on the way of paths included.
Attribute* linkTarget(const AttribLink& link, u32& hopsLeft);

/// The end of the chain of links that starts at `a`, or `a` itself if it is none. Null if the
/// chain breaks; then `broken` is the link that it breaks at.
Attribute* followLinks(Attribute* a, u32& hopsLeft, const AttribLink** broken = nullptr);

/// Counts the nested maps and arrays that are being copied on this thread.
class CloneDepth : public NonCopyable {
public:
    /// Throws `exception` beyond 256 levels.
    CloneDepth();
    ~CloneDepth();
};

} // namespace base
