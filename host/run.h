#pragma once

#include "host/messages.h"
#include "host/options.h"
#include "host/run_record.h"

#include "scene_factory.h"

namespace host {

/// One run from INPUT to OUTPUT: checks, import, export, summary and report.
class Run {
public:
    /// All arguments are borrowed. `options` and `registered` have been parsed; `clock` has
    /// measured what went before.
    Run(scene::SceneFactory& factory, const CommandLine& line,
        const base::CmdLineOptions& registered, const Messages& messages, StageClock clock);

    /// Does it all. What fails is logged; the report is written all the same.
    ExitCode execute();

private:
    void doStages();
    void prepareImport();
    void prepareExport();
    void warnOfIdleOptions(base::string_view group, const base::string& path) const;
    void importScene();
    void applySceneOptions();
    void exportScene();
    void storeScene();
    void checkFiles() const;
    void readBack();
    ExitCode judged(ExitCode failure) const;
    void writeReport();
    void printSummary() const;
    base::string listOf(const base::string& extensions) const;

    scene::SceneFactory& factory_;
    const HostOptions& options_;
    const base::CmdLineOptions& registered_;
    const Messages& messages_;
    RunRecord record_;
};

} // namespace host
