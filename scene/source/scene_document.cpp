#include "scene_document.h"

#include "scene_image_record.h"
#include "scene_schema.h"

#include "b_exception.h"
#include "b_format.h"
#include "b_log.h"
#include "b_string_convert.h"
#include "stream/b_fs.h"

#include <filesystem>

namespace scene {

namespace fs = base::fs;
using base::string;
using base::string_view;

namespace {

bool endsWithExtension(string_view path, string_view extension) {
    const string name = base::toLower(fs::fileName(path));
    return name.size() > extension.size() && name.ends_with(extension) &&
           name[name.size() - extension.size() - 1] == '.';
}

bool isBinary(string_view path) {
    return endsWithExtension(path, sceneDocumentExtensions[0]);
}

/// Calls `use` with each texture that shows a file and with the path of that.
template <class Use>
void forEachPicture(base::PluginFactory& document, const Use& use) {
    for (const base::ref<base::IPlugin>& object : document.plugins()) {
        if (!object || object->typeName() != fileTexture_schema::n_kind)
            continue;
        const string* file = find(*object, fileTexture_schema::n_file);
        if (file && !file->empty())
            use(*object, *file);
    }
}

/// The path of a file that exists as seen from `folder`, which it need not lie in; a full path if
/// the way leads by the root or through links that turn it aside.
string pathFrom(const string& folder, const string& file) {
    namespace stdfs = std::filesystem;
    std::error_code error;
    const stdfs::path full = stdfs::absolute(fs::master().resolve(file), error).lexically_normal();
    const stdfs::path start =
        stdfs::absolute(folder.empty() ? "." : folder, error).lexically_normal();
    const stdfs::path relative = full.lexically_proximate(start);
    const auto isName = [](const stdfs::path& part) { return !part.empty(); };
    const bool isByRoot = std::ranges::count(relative, stdfs::path("..")) >=
                          std::ranges::count_if(start.relative_path(), isName);
    if (isByRoot || !stdfs::equivalent(start / relative, full, error))
        return full.generic_string();
    return relative.generic_string();
}

/// Names the pictures of a document as they are stored while this lives; makes files of those that
/// have none.
class StoredPictures : base::NonCopyable {
public:
    StoredPictures(base::PluginFactory& document, const string& path)
        : folder_(fs::folder(path)), pictures_(fs::fileName(path) + ".pictures/") {
        forEachPicture(document, [&](base::IPlugin& texture, const string& file) {
            const string stored = findPictureSource(texture) ? copied(file) : named(file);
            if (stored != file)
                stored_.push_back({base::ref<base::IPlugin>(&texture), stored});
        });
        std::ranges::for_each(stored_, swapName);
    }
    /// In reverse, since the name of one texture may be a link to that of another.
    ~StoredPictures() {
        for (std::size_t i = stored_.size(); i-- > 0;)
            swapName(stored_[i]);
    }

    /// The files that were made.
    const base::vector<string>& written() const { return written_; }

private:
    struct StoredName {
        base::ref<base::IPlugin> texture;
        string file; ///< for the document or, while that is written, for the scene
    };

    static void swapName(StoredName& stored) {
        std::swap(write(*stored.texture, fileTexture_schema::n_file), stored.file);
    }

    /// A file that is there is named from the document's folder.
    string named(const string& file) const {
        if (fs::master().exists(file))
            return pathFrom(folder_, file);
        base::log().log(base::logScene, base::logWarning,
                        "document |{}| The picture is not there and keeps its name!", file);
        return file;
    }

    /// The name of a copy in the folder of pictures, unlike those of other pictures.
    string copied(const string& file) {
        const auto [known, isNew] = copies_.try_emplace(file);
        if (!isNew)
            return known->second;
        string name = pictures_ + fs::fileName(file);
        for (int number = 2; !names_.insert(base::toLower(name)).second; ++number)
            name = base::format("{}{}_{}", pictures_, number, fs::fileName(file));
        known->second = name;
        fs::master().mkdir(folder_ + pictures_);
        fs::master().copy(file, folder_ + name);
        written_.push_back(folder_ + name);
        return name;
    }

    string folder_;                    ///< of the document
    string pictures_;                  ///< the folder of pictures as seen from there
    base::map<string, string> copies_; ///< the name of each file's copy
    base::set<string> names_;          ///< of the copies, in lower case
    base::vector<string> written_;
    base::vector<StoredName> stored_;
};

/// Pictures named from the document's folder, of those from `firstId` on, are named as they are
/// found from the current one.
void findPictures(base::PluginFactory& document, base::u32 firstId, const string& path) {
    forEachPicture(document, [&](base::IPlugin& texture, const string& file) {
        const string found = fs::joined(fs::folder(path), file);
        if (texture.id() >= firstId && !fs::isAbsolute(file) && fs::master().exists(found))
            write(texture, fileTexture_schema::n_file) = found;
    });
}

} // namespace

bool isSceneDocument(string_view path) {
    return std::ranges::any_of(sceneDocumentExtensions, [&](string_view extension) {
        return endsWithExtension(path, extension);
    });
}

void readSceneDocument(base::PluginFactory& document, const string& path) {
    base::Stream stream;
    fs::master().open(stream, path, fs::openRead | fs::openShareRead);
    stream.setFlags(stream.flags() | base::streamThrowOnShortRead);
    const base::u32 firstId = document.pluginCount();
    if (!(isBinary(path) ? document.read(stream) : document.readJson(stream)))
        throw base::exception("is no whole scene document", "scene_document",
                              "scene::readSceneDocument", __LINE__);
    findPictures(document, firstId, path);
}

base::vector<string> writeSceneDocument(base::PluginFactory& document, const string& path) {
    const StoredPictures pictures(document, path);
    base::Stream stream = fs::createFile(path);
    if (isBinary(path))
        document.write(stream);
    else
        document.writeJson(stream);
    base::vector<string> files = {path};
    files.append(pictures.written().begin(), pictures.written().end());
    return files;
}

} // namespace scene
