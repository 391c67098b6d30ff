#pragma once

#include "measure.h"
#include "scenes.h"

#include <vector>

/// Scenes of materials with maps, and what their export must hold.
namespace bench {

/// Picture files for the materials of a scene, one of a kind for each, in a folder of their own.
/// All differ in their grain. A list is empty where materials have no map of the kind.
class MapFiles {
public:
    static constexpr base::u32 materialCount = 16;
    using List = std::vector<std::string>;

    /// Writes opaque pictures in colour and grey ones, for a side of 0 none.
    MapFiles(base::u32 colourSide, base::u32 roughnessSide, base::u32 metalSide);

    const List& colours() const { return colours_; }
    const List& roughness() const { return roughness_; }
    const List& metal() const { return metal_; }

private:
    List write(const char* name, base::u32 side, base::u8 format);

    OutputFolder folder_;
    base::u32 seed_ = 0; ///< of the picture written last
    List colours_, roughness_, metal_;
};

/// A triangle of its own for each material.
ScenePtr makeTexturedScene(const MapFiles& files);

/// The pictures inside of an exported container.
struct ExportedPictures {
    base::u32 count = 0;
    base::u64 byteCount = 0;
};
/// Throws unless all are JPEG files of `side` by `side` pixels.
ExportedPictures readPictures(const std::string& path, base::u32 side);

} // namespace bench
