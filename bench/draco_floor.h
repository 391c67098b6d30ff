#pragma once

#include "scenes.h"

namespace draco {
class Mesh;
}

namespace bench {

/// The floor of compressed exports: the bare encoder, at its default speed and with the bits of
/// the exporter, on meshes that are ready for it.
class DracoFloor {
public:
    explicit DracoFloor(const base::vector<MeshArrays>& meshes);
    ~DracoFloor();

    /// Encodes each mesh by itself and returns the bytes of all streams.
    std::size_t encode() const;

private:
    base::vector<std::unique_ptr<draco::Mesh>> meshes_;
};

} // namespace bench
