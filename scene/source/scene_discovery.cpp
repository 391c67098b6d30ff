#include "scene_factory.h"

#include "b_exception.h"
#include "b_log.h"
#include "b_string_convert.h"
#include "stream/b_fs.h"

#include <algorithm>

#include <dlfcn.h>

namespace scene {

namespace {

using LoadFunction = base::i32 (*)(base::PluginFactory&);
using UnloadFunction = base::u32 (*)();

constexpr const char* libraryPattern = "scene_*.so";
constexpr const char* orderFile = "importers.txt";

/// Logs `text` and, in a handler, what was thrown.
void logUnhandled(const char* text) {
    base::log().log(base::logScene, base::logError, text);
    try {
        throw;
    } catch (const base::exception& e) {
        e.report(base::log());
    } catch (const std::exception& e) {
        base::log().log(base::logSystem, base::logError, "{}", e.what());
    } catch (...) {
    }
}

base::string readText(const base::string& path) {
    base::Stream stream;
    base::fs::master().open(stream, path, base::fs::openRead | base::fs::openShareRead);
    base::string text(static_cast<std::size_t>(stream.size()), '\0');
    text.resize(static_cast<std::size_t>(stream.read(text.data(), text.size())));
    return text;
}

/// The lines of the file without comments, blanks around them and empty ones.
base::vector<base::string> readNames(const base::string& path) {
    base::vector<base::string> names;
    const base::string text = readText(path);
    for (base::string_view line : base::split(text, '\n')) {
        line = base::trimmed(line.substr(0, line.find("//")));
        if (!line.empty())
            names.push_back(base::string(line));
    }
    return names;
}

/// True if anybody but the list itself holds one of the descriptions: an object of that type is
/// alive.
bool inUse(const base::vector<base::ref<base::IPluginDesc>>& descs) {
    return std::any_of(descs.begin(), descs.end(),
                       [](const auto& desc) { return desc->refCount() > 1; });
}

} // namespace

void SceneFactory::loadLibrary(const base::string& path) {
    base::log().log(base::logScene, base::logDebug, "Trying to load '{}' as a scene plugin...",
                    path);
    base::string file = base::fs::master().resolve(path);
    if (file.find('/') == base::string::npos)
        file.insert(0, "./"); // else the system's library folders are searched
    void* handle = dlopen(file.c_str(), RTLD_NOW | RTLD_LOCAL | RTLD_NODELETE);
    const char* error = handle ? nullptr : dlerror();
    auto loadFunction =
        handle ? reinterpret_cast<LoadFunction>(dlsym(handle, "loadScenePlugin")) : nullptr;
    if (!loadFunction) {
        base::log().log(base::logScene, base::logError, "Failed to load scene plugin '{}'!", path);
        if (error)
            base::log().log(base::logScene, base::logInformation, "{}", error);
        if (handle)
            dlclose(handle);
        return;
    }
    const base::map<base::name_id, base::ref<base::IPluginDesc>> before = descs();
    const std::size_t index = libraries_.size();
    libraries_.push_back(Library{handle, {}});
    const auto noteRegistered = [&] {
        for (const auto& [type, desc] : descs()) {
            if (!before.contains(type))
                libraries_[index].descs.push_back(desc);
        }
    };
    try {
        loadFunction(*this);
    } catch (...) {
        noteRegistered();
        throw;
    }
    noteRegistered();
}

void SceneFactory::loadFrom(const base::string& directory) {
    base::log().log(base::logScene, base::logDebug, "Loading scene plugins from path '{}' ...",
                    directory);
    try {
        for (const base::string& name : base::fs::master().findFiles(directory, libraryPattern))
            loadLibrary(base::fs::joined(directory, name));
    } catch (...) {
        logUnhandled("Unhandled exception occurred while loading the mesh plugins!");
    }
}

void SceneFactory::unloadPlugins() {
    handlers_.clear();
    for (Library& library : libraries_) {
        for (const base::ref<base::IPluginDesc>& desc : std::as_const(library.descs))
            unregisterDesc(desc);
        // The handle of a library with living objects is left open.
        if (inUse(library.descs))
            continue;
        try {
            if (auto unload =
                    reinterpret_cast<UnloadFunction>(dlsym(library.handle, "unloadScenePlugin")))
                unload();
        } catch (...) {
            logUnhandled("Unhandled exception occurred while unloading the mesh plugins!");
        }
        library.descs.clear();
        dlclose(library.handle);
    }
    libraries_.clear();
}

void SceneFactory::orderHandlers(const base::string& listPath) {
    base::vector<base::string> names;
    try {
        names = readNames(listPath);
    } catch (const base::exception&) {
        base::log().log(base::logScene, base::logError, "Can't open importers.txt!");
    }
    for (const base::string& name : std::as_const(names)) {
        const base::ref<base::IPluginDesc> desc = findDesc(base::nameServer().find(name));
        auto* plugin = dynamic_cast<IScenePluginDesc*>(desc.get());
        if (!plugin)
            base::log().log(base::logScene, base::logWarning,
                            "Can't find mesh importer called '{}'!", name);
        else if (std::find(handlers_.begin(), handlers_.end(), plugin) == handlers_.end())
            handlers_.push_back(plugin);
    }
}

void SceneFactory::loadPlugins(const base::string& directory) {
    unloadPlugins();
    const base::string folder = directory.empty() ? base::fs::moduleFolder() : directory;
    loadFrom(folder);
    orderHandlers(base::fs::joined(folder, orderFile));
}

} // namespace scene
