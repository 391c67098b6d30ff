#pragma once

#include "b_factory.h"
#include "scene_config.h"

/// Scenes stored as they are: all objects and attributes, without conversion.
///
/// The pictures of a scene stay files of their own. A document names them from its folder, so that
/// both can be moved together; a picture that has no file of its own, since its scene was read
/// from a file that holds it, gets one in a folder beside the document, which has the name of the
/// document with ".pictures" behind.
namespace scene {

/// The extensions of scene documents, without dots: of the binary form and of the JSON form.
inline constexpr base::string_view sceneDocumentExtensions[] = {"scene", "scene.json"};

/// True if `path` ends with such an extension, in capitals or not.
SCENE_API bool isSceneDocument(base::string_view path);

/// Adds what the document at `path` holds to `document`. Values that can't be read are logged and
/// left out. Throws `base::exception` for a file that can't be opened or is no such document; then
/// nothing is added.
SCENE_API void readSceneDocument(base::PluginFactory& document, const base::string& path);

/// Writes all of `document` to `path`, in the form that the extension tells, and pictures beside it
/// where they have no file. While it writes, the textures have the names that it stores. Returns
/// the files, the document first. Throws `base::exception` if one can't be written; others may be
/// there then. What closing a file brings to light is logged.
SCENE_API base::vector<base::string> writeSceneDocument(base::PluginFactory& document,
                                                        const base::string& path);

} // namespace scene
