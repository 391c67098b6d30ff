#include "host/run.h"

#include "host/crash_guard.h"
#include "host/paths.h"
#include "host/printing.h"
#include "host/report.h"
#include "host/scene_dump.h"
#include "host/summary.h"

#include "b_string_convert.h"
#include "scene_document.h"
#include "scene_options.h"
#include "scene_schema.h"
#include "stream/b_fs.h"

#include <algorithm>
#include <new>

namespace host {

using base::AttribMap;
using base::string;

namespace {

/// Calls `work`; what it throws becomes a `Failure` with `code` that tells what failed with `path`
/// and what was expected of it.
template <class Work>
void attempt(ExitCode code, const string& path, const string& expected, const Work& work) {
    string reason;
    try {
        work();
        return;
    } catch (const Failure&) {
        throw;
    } catch (const std::bad_alloc&) {
        reason = "there is not enough memory for it";
    } catch (const std::exception& e) {
        reason = e.what();
    } catch (...) {
        reason = "an unknown exception was thrown";
    }
    reason.resize(reason.find_last_not_of(".! \n") + 1); // the sentence goes on
    throw Failure(code, base::format("{}: {}, expected {}.", path, reason, expected));
}

/// Tells the folders in which pictures are looked for.
void storeResourceFolders(const base::vector<string>& folders, AttribMap& settings) {
    if (folders.empty())
        return;
    auto& paths = write(settings, scene::sceneExporter_schema::n_resourcePaths);
    // With the separator: plugins put the name of a file right behind.
    for (const string& folder : folders)
        paths.push_back(base::fs::joined(folder, ""));
}

/// Tells how far the run is, for the bar.
void tellProgress(base::u32 percent, const char* what, const string& path) {
    base::log().progress(percent, base::format("{} {}", what, base::fs::fileName(path)));
}

} // namespace

Run::Run(scene::SceneFactory& factory, const CommandLine& line,
         const base::CmdLineOptions& registered, const Messages& messages, StageClock clock)
    : factory_(factory), options_(line.host), registered_(registered), messages_(messages) {
    record_.input = line.files[0];
    record_.output = line.files.size() > 1 ? line.files[1] : string();
    record_.isDryRun = options_.dryRun != 0;
    record_.clock = std::move(clock);
}

ExitCode Run::execute() {
    ExitCode failure = ExitCode::done;
    try {
        doStages();
    } catch (const Failure& e) {
        base::log().progressEnd();
        failure = e.code;
        for (const string& text : e.texts)
            base::log().log(base::logSystem, base::logError, text);
    }
    base::log().progressEnd();
    record_.exitCode = judged(failure);
    try {
        if (!options_.reportFile.empty())
            attempt(ExitCode::output, options_.reportFile, "a file that can be written",
                    [&] { writeReport(); });
    } catch (const Failure& e) {
        base::log().log(base::logSystem, base::logError, e.texts[0]);
        record_.exitCode = judged(failure == ExitCode::done ? e.code : failure);
    }
    if (!options_.dump &&
        (record_.exitCode == ExitCode::done || record_.exitCode == ExitCode::strict))
        printSummary();
    return record_.exitCode;
}

void Run::doStages() {
    record_.clock.begin("import");
    attempt(ExitCode::input, record_.input, "a file that can be read",
            [&] { checkInput(record_.input); });
    attempt(ExitCode::input, record_.input, listOf(factory_.getImporterExtensions()),
            [&] { prepareImport(); });
    if (!options_.dump) {
        attempt(ExitCode::noExport, record_.output, listOf(factory_.getExporterExtensions()),
                [&] { prepareExport(); });
        checkOutput(record_.output);
    }
    tellProgress(10, "Reading", record_.input);
    attempt(ExitCode::input, record_.input, "a model that can be read", [&] { importScene(); });
    applySceneOptions();
    if (options_.dump) {
        base::log().progressEnd();
        print(stdout, sceneText(factory_));
        return;
    }
    if (!scene::isSceneDocument(record_.output))
        record_.unexported = findUnexported(factory_);

    record_.clock.begin("export");
    tellProgress(50, record_.isDryRun ? "Checking" : "Writing", record_.output);
    if (record_.isDryRun)
        attempt(ExitCode::input, record_.input, "a scene that can be checked",
                [&] { record_.scene = checkScene(factory_, messages_); });
    else if (scene::isSceneDocument(record_.output))
        attempt(ExitCode::output, record_.output, "room and leave to write it",
                [&] { storeScene(); });
    else
        attempt(ExitCode::noExport, record_.output, "a scene that can be exported",
                [&] { exportScene(); });

    record_.clock.begin("report");
    if (!record_.isDryRun && !record_.written.objects)
        attempt(ExitCode::output, record_.output, "a whole file that can be read back",
                [&] { readBack(); });
}

/// Finds the importer and its settings.
void Run::prepareImport() {
    if (scene::isSceneDocument(record_.input)) {
        warnOfIdleOptions("importer", record_.input);
        return;
    }
    const CrashGuard guard(record_.input);
    AttribMap& settings = record_.settings.importer;
    if (!factory_.getImporterParameters(record_.input, settings))
        throw base::exception("no plugin reads files of this kind");
    base::vector<string> errors;
    scene::applyOptions(registered_, "importer", settings, errors);
    storeResourceFolders(options_.resourceFolders, settings);
}

/// Finds the exporter and its settings.
void Run::prepareExport() {
    if (scene::isSceneDocument(record_.output)) {
        warnOfIdleOptions("exporter", record_.output);
        return;
    }
    AttribMap& settings = record_.settings.exporter;
    if (!factory_.getExporterParameters(record_.output, settings))
        throw base::exception("no plugin writes files of this kind");
    base::vector<string> errors;
    scene::applyOptions(registered_, "exporter", settings, errors);
    storeResourceFolders(options_.resourceFolders, settings);
}

/// Scene documents are read and written as they are, whatever the settings.
void Run::warnOfIdleOptions(base::string_view group, const string& path) const {
    for (const base::CmdLineGroup& options : registered_.groups())
        for (const base::ref<base::CmdLineOption>& option : options.options)
            if (options.name == group && option->seen)
                base::log().log(base::logSystem, base::logWarning,
                                "{}: option '{}' has no effect on a scene document.", path,
                                option->name);
}

void Run::importScene() {
    if (scene::isSceneDocument(record_.input)) {
        scene::readSceneDocument(factory_, record_.input);
        return;
    }
    const CrashGuard guard(record_.input);
    if (!factory_.load(factory_, record_.input, record_.settings.importer))
        throw Failure(ExitCode::input,
                      record_.input + ": could not be read, expected a file of the kind that its "
                                      "extension tells. The messages above are the reader's.");
}

void Run::applySceneOptions() {
    using Schema = scene::scene_schema;
    const base::ref<base::IPlugin> scene = factory_.firstOfType(Schema::n_kind);
    if (!scene)
        return;
    const auto* upAxis =
        dynamic_cast<const base::CmdLineValue<base::u8>*>(registered_.find("-upAxis"));
    if (upAxis && upAxis->seen)
        write(*scene, Schema::n_upAxis) = upAxis->values[0];
    write(record_.settings.scene, Schema::n_upAxis) = read(*scene, Schema::n_upAxis);
}

void Run::exportScene() {
    if (!factory_.save(factory_, record_.output, record_.settings.exporter))
        throw Failure(ExitCode::noExport,
                      record_.output + ": there is nothing to write, expected a scene with a root "
                                       "node in the input.");
    checkFiles();
}

void Run::storeScene() {
    const base::vector<string> files = scene::writeSceneDocument(factory_, record_.output);
    checkFiles();
    const auto isStored = [](const base::ref<base::IPlugin>& object) {
        return object && !object->hasFlag(base::attribTransient);
    };
    record_.written = findOutput(
        files, static_cast<base::u64>(std::ranges::count_if(factory_.plugins(), isStored)));
}

void Run::checkFiles() const {
    if (messages_.countFailedFiles() != 0)
        throw Failure(ExitCode::output,
                      record_.output + ": not all files could be written, expected room and leave "
                                       "to write them. The messages above tell which.");
}

void Run::readBack() {
    const base::ref<base::IPlugin> scene = factory_.firstOfType(scene::scene_schema::n_kind);
    if (scene)
        record_.images = scene::findImageRecords(*scene);
    record_.written = readOutput(record_.output);
}

/// The exit code with what the log received taken into account.
ExitCode Run::judged(ExitCode failure) const {
    if (failure != ExitCode::done)
        return failure;
    return options_.strict && !messages_.all().empty() ? ExitCode::strict : ExitCode::done;
}

void Run::writeReport() {
    record_.clock.end();
    const std::size_t failedBefore = messages_.countFailedFiles();
    const string text = reportText(record_, messages_.all(), registered_);
    base::fs::writeFile(options_.reportFile, text.data(), text.size());
    if (messages_.countFailedFiles() != failedBefore)
        throw base::exception("could not be closed");
}

void Run::printSummary() const {
    if (!options_.quiet)
        print(stdout, summaryLine(record_) + "\n");
}

/// The extensions of a list and those of scene documents, with a dot in front of each.
string Run::listOf(const string& extensions) const {
    string list;
    for (base::string_view entry : base::split(extensions, ';')) {
        entry = base::trimmed(entry.substr(0, entry.find('|')));
        if (!entry.empty())
            list.append(list.empty() ? "." : ", .").append(entry);
    }
    if (list.empty())
        return "a plugin for it in " +
               (options_.pluginFolder.empty() ? base::fs::moduleFolder() : options_.pluginFolder);
    for (const base::string_view extension : scene::sceneDocumentExtensions)
        list.append(", .").append(extension);
    return list;
}

} // namespace host
