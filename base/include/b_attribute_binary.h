#pragma once

#include "b_attribute.h"

/// The binary form of attributes: a byte of flags and the value, all numbers little-endian.
///
/// In maps and arrays the number of its bytes stands before each attribute. So a reader gets past
/// what it does not know, and a broken value can't take the following ones with it. What doesn't
/// fit into the bytes that are there is a short read of the stream: an `exception` with
/// `streamThrowOnShortRead`; without, in silence, what was whole is kept, a value cut in the
/// middle is zero, and `read` gives false. No memory is taken that the bytes do not pay for.
///
/// Both directions throw `exception` if maps and arrays lie in each other deeper than 256 levels.
/// Whole documents are written and read by `PluginFactory`.
namespace base {

class PluginFactory;
struct BinaryReadState;
struct BinaryWriteState;

struct BinaryWriteOptions {
    /// The document that references stay within: others, and those to objects that are transient
    /// or in no list, are written as null and reported in the log. Null takes the objects of any
    /// document for those of this one.
    const PluginFactory* factory = nullptr;
    BinaryWriteState* state = nullptr; ///< of the call under way, null between calls
};

struct BinaryReadOptions {
    /// The document that references lead into. Without one all are null; one that leads to no
    /// object is null as well and reported in the log. Paths of links keep their ids in any case.
    const PluginFactory* factory = nullptr;
    u32 firstId = 0;                  ///< is added to the ids that were stored
    BinaryReadState* state = nullptr; ///< of the call under way, null between calls
};

} // namespace base
