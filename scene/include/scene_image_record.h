#pragma once

#include "b_attribute_map.h"
#include "scene_config.h"

/// What became of the pictures of a scene in the file that it was exported to. An exporter leaves
/// it, for its host to report, at the `scene` object, as a transient attribute.
namespace scene {

/// One picture of the exported file.
struct ImageRecord {
    enum class Work : base::u8 {
        kept,      ///< the bytes of its source
        converted, ///< read and written again in another format
        resized,   ///< the same, in another size
        packed,    ///< made of channels of several pictures
        normalMap, ///< made from a height map
    };

    base::string name;                  ///< its uri or the name of its side file
    base::vector<base::string> sources; ///< the files that it was made of
    Work work = Work::kept;
    base::i32 width = -1; ///< in pixels, -1 if the file does not tell
    base::i32 height = -1;
    base::u32 byteLength = 0; ///< of the encoded picture; 0 if it could not be read
};

/// Replaces the records at `scene`.
SCENE_API void storeImageRecords(base::AttribMap& scene, const base::vector<ImageRecord>& records);
/// Those of the last export, empty without one.
SCENE_API base::vector<ImageRecord> findImageRecords(const base::AttribMap& scene);

/// Tells, by a transient attribute, that the file of `texture` was made from the one at `path`,
/// such as a model that holds the picture.
SCENE_API void setPictureSource(base::AttribMap& texture, const base::string& path);
/// Null for a texture that shows a file as it is.
SCENE_API const base::string* findPictureSource(const base::AttribMap& texture);

/// Tells, by an attribute that is stored with the scene, that the alpha of the picture of `texture`
/// does not count where it is opaque everywhere: the format of its model reads no transparency from
/// it.
SCENE_API void setIgnoresOpaqueAlpha(base::AttribMap& texture);
SCENE_API bool ignoresOpaqueAlpha(const base::AttribMap& texture);

/// Tells, by a transient attribute, of picture files that the scene was made of, shown by a texture
/// or not: exporters must not write over them.
SCENE_API void setPictureFiles(base::AttribMap& scene, const base::vector<base::string>& paths);
/// Null if there are none.
SCENE_API const base::vector<base::string>* findPictureFiles(const base::AttribMap& scene);

} // namespace scene
