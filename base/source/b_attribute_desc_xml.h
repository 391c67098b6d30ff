#pragma once

#include "b_attribute_desc.h"

/// Descriptions as XML.
namespace base {

/// The content of one description file.
struct AttribDescFile {
    AttribDescManager::FileAttributes attributes;
    vector<ref<AttribMapDesc>> descs; ///< in the order of the file, for `manager`
};

/// Reads the text of a file; `path` is for messages. Throws `exception` with the parser's message
/// for what is no XML. Nothing else is an error: the log gets a warning for a number that is none
/// and for a type without a name, and what is unknown is skipped.
AttribDescFile readAttribDescs(string text, const string& path, const AttribDescManager& manager);

} // namespace base
