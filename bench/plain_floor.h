#pragma once

#include "scenes.h"

/// The floor of exports without compression: what it takes to bring the same bytes into the same
/// file. All memory is fresh, as it is for an export.
namespace bench {

/// What an exported file holds beside its data.
struct FileFrame {
    std::string before, after;
};

/// Of a container whose binary chunk holds `byteCount` bytes and padding. Throws if the file is not
/// that.
FileFrame readContainerFrame(const std::string& path, std::size_t byteCount);
/// Of a text that embeds one buffer of `byteCount` bytes. Throws if the file is not that.
FileFrame readTextFrame(const std::string& path, std::size_t byteCount);

/// Copies the arrays into an intermediate block, that with the frame into the final one, and
/// writes it by one call.
void writePlain(const base::vector<MeshArrays>& meshes, const FileFrame& frame,
                const std::string& path);
/// The same with the base64 form of the data, encoded from a second block by the encoder of the
/// `base` library.
void writeEmbedded(const base::vector<MeshArrays>& meshes, const FileFrame& frame,
                   const std::string& path);

} // namespace bench
