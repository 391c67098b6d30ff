#pragma once

#include "assimp/picture_kind.h"
#include "b_factory.h"
#include "i_image.h"
#include "stream/b_temporary_folder.h"

#include <optional>
#include <span>

namespace assimp {

/// The files that an import makes of pictures which are none yet or none that exporters read. They
/// die with this object, so the scene keeps it; nothing else in a document outlives the import but
/// goes with the scene.
class PictureFolder final : public base::IPlugin {
public:
    PictureFolder() : base::IPlugin(nullptr, nullptr, base::IPlugin::noId) {}

    /// Writes a file named after `name` and returns its path. What can't be in the name of a file
    /// is left out, and a number makes it unlike the others. Throws `base::exception` if that
    /// fails.
    base::string add(base::string_view name, base::string_view extension,
                     std::span<const base::u8> bytes);
    /// The same with a PNG file of `image`.
    base::string add(base::string_view name, iio::Image& image);
    /// The same with the picture in `bytes`: as they are or, of a foreign format, as a PNG.
    base::string addReadable(base::string_view name, std::span<const base::u8> bytes,
                             PictureKind kind);
    bool isEmpty() const { return names_.empty(); }

private:
    base::string newPath(base::string_view name, base::string_view extension);

    std::optional<base::fs::TemporaryFolder> folder_; ///< from the first file on
    base::set<base::string> names_;                   ///< in lower case
};

} // namespace assimp
