#include "assimp/importer.h"

#include "assimp/import_scene.h"
#include "assimp/library_text.h"
#include "assimp/ply_header.h"

#include "b_log.h"
#include "b_string_convert.h"
#include "scene_schema.h"
#include "stream/b_fs.h"

#include <assimp/DefaultLogger.hpp>
#include <assimp/Importer.hpp>
#include <assimp/config.h>
#include <assimp/scene.h>

#include <algorithm>
#include <memory>

namespace assimp {

namespace {

/// Formats of the library's that are not offered, see `AssimpImporterDesc`. Motion files hold
/// nothing but a skeleton and its animation.
constexpr base::string_view excludedExtensions[] = {"gltf",    "glb",       "assbin", "bvh", "csm",
                                                    "md5anim", "md5camera", "mot",    "vta"};

base::string makeExtensionList() {
    aiString all;
    Assimp::Importer().GetExtensionList(all);
    base::string list;
    for (base::string_view entry : base::split(viewOf(all), ';')) {
        entry.remove_prefix(std::min(entry.find_first_not_of("*."), entry.size()));
        if (entry.empty() ||
            std::ranges::find(excludedExtensions, entry) != std::end(excludedExtensions))
            continue;
        list.append(list.empty() ? "" : ";").append(entry);
    }
    return list;
}

const base::string& extensionList() {
    static const base::string list = makeExtensionList();
    return list;
}

/// Passes the library's messages on to the log, where they are of interest to whoever debugs.
class LibraryMessages final : public Assimp::LogStream {
public:
    void write(const char* message) override {
        base::log().log(base::logIO, base::logDebug, "assimp | {}", base::trimmed(message));
    }
};

/// Errors of the library's after which nothing is missing: what it does without materials of the
/// file's own, and that it looked for another MTL file in vain, as it has told of the first.
constexpr base::string_view harmlessErrors[] = {"FBX: no material assigned",
                                                "OBJ: No object detected to attach",
                                                "OBJ: Unable to locate fallback material file"};

/// Keeps the errors that the library goes on after: what it could not read is missing then. Those
/// about materials are left out if materials are not taken over.
class LibraryErrors final : public Assimp::LogStream {
public:
    LibraryErrors(base::vector<base::string>& texts, bool materials)
        : texts_(texts), materials_(materials) {}
    void write(const char* message) override {
        base::string_view text = base::trimmed(message);
        const std::size_t mark = text.find(": "); // behind "Error, T0"
        text.remove_prefix(mark == text.npos ? 0 : mark + 2);
        const auto isStart = [&](base::string_view start) { return text.starts_with(start); };
        if (std::ranges::any_of(harmlessErrors, isStart) ||
            (!materials_ && text.find("aterial") != text.npos))
            return;
        texts_.push_back(base::string(text));
    }

private:
    base::vector<base::string>& texts_;
    bool materials_;
};

/// While it lives the library's errors are kept and its messages passed on, if the log takes any of
/// that level. The library has no logger else and writes nowhere.
class LibraryLog {
public:
    LibraryLog(base::vector<base::string>& errors, bool materials) {
        using Assimp::Logger;
        Assimp::DefaultLogger::create("", Logger::NORMAL, 0);
        Assimp::DefaultLogger::get()->attachStream(new LibraryErrors(errors, materials),
                                                   Logger::Err);
        if (base::log().levelLimit() >= base::logDebug)
            Assimp::DefaultLogger::get()->attachStream(new LibraryMessages,
                                                       Logger::Err | Logger::Warn | Logger::Info);
    }
    ~LibraryLog() { Assimp::DefaultLogger::kill(); }
    LibraryLog(const LibraryLog&) = delete;
    LibraryLog& operator=(const LibraryLog&) = delete;
};

/// Warns of what the library could not read.
void reportErrors(const base::vector<base::string>& errors, const base::string& path) {
    constexpr std::size_t mostTold = 10;
    for (std::size_t i = 0; i < std::min(errors.size(), mostTold); ++i)
        base::log().log(base::logIO, base::logWarning, "assimp |{}| {}", path, errors[i]);
    if (errors.size() > mostTold)
        base::log().log(base::logIO, base::logWarning, "assimp |{}| There are {} more such errors.",
                        path, errors.size() - mostTold);
}

/// True for a scene that holds nothing at all: readers make such ones of files of other kinds.
bool isEmpty(const aiScene& scene) {
    return scene.mNumMeshes + scene.mNumCameras + scene.mNumLights + scene.mNumAnimations == 0 &&
           (!scene.mRootNode || scene.mRootNode->mNumChildren == 0);
}

/// Null, with the reason in `error`, if the file can't be read. The steps of the library that
/// change a scene are not used. `materials` tells whether they are of interest.
std::unique_ptr<aiScene> readFile(const base::string& path, bool materials, base::string& error) {
    base::vector<base::string> errors;
    const LibraryLog log(errors, materials);
    try {
        if (!isPlyHeaderWhole(path)) {
            error = "The header has no end.";
            return nullptr;
        }
        Assimp::Importer importer;
        // Files without meshes get none that show their skeleton.
        importer.SetPropertyBool(AI_CONFIG_IMPORT_NO_SKELETON_MESHES, true);
        // What the file's author wrote, not the ids beside it.
        importer.SetPropertyBool(AI_CONFIG_IMPORT_COLLADA_USE_COLLADA_NAMES, true);
        if (const aiScene* scene = importer.ReadFile(base::fs::master().resolve(path), 0)) {
            if (!isEmpty(*scene)) {
                reportErrors(errors, path);
                return std::unique_ptr<aiScene>(importer.GetOrphanedScene());
            }
            error = errors.empty() ? "It holds neither nodes nor meshes." : errors[0];
        } else {
            error = importer.GetErrorString();
        }
    } catch (const std::exception& e) {
        error = e.what();
    } catch (...) {
        error = "Unknown error.";
    }
    return nullptr;
}

} // namespace

AssimpImporterDesc::AssimpImporterDesc() {
    version = 1;
    type = base::nameServer().id("AssimpImporter");
    author = "The scene framework";
    info = "Reads the model formats of the assimp library.";
}

base::IPlugin* AssimpImporterDesc::create(base::PluginFactory& factory, base::u32 id) {
    return new AssimpImporter(this, &factory, id);
}

const base::string& AssimpImporterDesc::importExtensions() const {
    return extensionList();
}

const base::string& AssimpImporterDesc::exportExtensions() const {
    static const base::string none;
    return none;
}

bool AssimpImporter::canLoad(const base::string& path) {
    const base::string name = base::toLower(base::fs::fileName(path));
    const auto isSuffix = [&](base::string_view extension) {
        return name.size() > extension.size() && name.ends_with(extension) &&
               name[name.size() - extension.size() - 1] == '.';
    };
    return std::ranges::any_of(base::split(extensionList(), ';'), isSuffix) &&
           base::fs::master().exists(path);
}

bool AssimpImporter::load(base::PluginFactory& scene, const base::string& path) {
    const bool hasMaterials = scene::read(*this, scene::sceneImporter_schema::n_importMaterials);
    base::string error;
    const std::unique_ptr<aiScene> source = readFile(path, hasMaterials, error);
    if (!source || !source->mRootNode) {
        base::log().log(base::logIO, base::logError, "assimp |{}| Unable to read the file: {}",
                        path, source ? "It has no nodes." : base::string(base::trimmed(error)));
        return false;
    }
    importScene(*source, *this, path, scene);
    return true;
}

void registerPlugin(base::PluginFactory& factory) {
    scene::register_scene_schema(factory);
    scene::register_viewport_schema(factory);
    scene::register_importer_schema();
    scene::register_exporter_schema();
    factory.registerDesc(base::makeRef<AssimpImporterDesc>());
}

} // namespace assimp
