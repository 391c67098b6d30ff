#include "host/version.h"

#include "host/printing.h"

#include "b_format.h"

#include <rapidjson/rapidjson.h>

#include <algorithm>
#include <dlfcn.h>
#include <filesystem>
#include <gnu/libc-version.h>
#include <link.h>

namespace host {

using base::string;

namespace {

/// The full paths of the shared libraries in this process. The names behind links hold the
/// libraries' versions.
base::vector<string> loadedLibraries() {
    base::vector<string> paths;
    const auto add = [](dl_phdr_info* info, std::size_t, void* list) {
        std::error_code error;
        const base::string_view name = info->dlpi_name;
        const std::filesystem::path path = std::filesystem::canonical(name, error);
        if (!error && name.find('/') != name.npos)
            static_cast<base::vector<string>*>(list)->push_back(path.string());
        return 0;
    };
    dl_iterate_phdr(add, &paths);
    std::sort(paths.begin(), paths.end());
    return paths;
}

/// The version of the library for polygons, which is opened only when one needs it.
string geosVersion() {
    void* library = dlopen("libgeos_c.so.1", RTLD_NOW | RTLD_LOCAL);
    void* version = library ? dlsym(library, "GEOSversion") : nullptr;
    return version ? reinterpret_cast<const char* (*)()>(version)() : "not installed";
}

} // namespace

string versionText(const scene::SceneFactory& factory) {
    string text = base::format("{} {}\n\nPlugins:\n", programName, programVersion);
    for (const auto& [type, desc] : factory.descs()) {
        if (dynamic_cast<const scene::IScenePluginDesc*>(desc.get()))
            text += base::format("  {}{}{}\n", type, desc->info.empty() ? "" : ": ", desc->info);
    }
    const string geos = geosVersion();
    text += "\nLibraries:\n";
    const base::vector<string> libraries = loadedLibraries();
    for (const string& path : libraries)
        text += base::format("  {}\n", path);
    text +=
        base::format("\nC library {}, GEOS {}, RapidJSON {}, compiled with {}\n",
                     gnu_get_libc_version(), geos, RAPIDJSON_VERSION_STRING, "g++ " __VERSION__);
    return text;
}

} // namespace host
