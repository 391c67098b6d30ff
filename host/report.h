#pragma once

#include "host/document_counts.h"
#include "host/exit_code.h"
#include "host/messages.h"
#include "host/scene_contents.h"
#include "host/stage_clock.h"

#include "b_attribute_map.h"

namespace host {

/// The settings in force, as attributes of their names.
struct Settings {
    base::AttribMap scene;
    base::AttribMap importer;
    base::AttribMap exporter;
};

/// What a run did: what the summary and the report tell of.
struct RunRecord {
    base::string input;
    base::string output;
    bool isDryRun = false;
    ExitCode exitCode = ExitCode::done;
    Settings settings;
    Output written;    ///< without files also if the run ended before
    SceneCounts scene; ///< of a dry run
    base::vector<ObjectName> unexported;
    StageClock clock;
};

/// The line that tells what has been done, or of a dry run what would be.
base::string summaryLine(const RunRecord& record);

/// The JSON text of the report. `registered` tells the words for the values of settings.
base::string reportText(const RunRecord& record, const base::vector<Message>& messages,
                        const base::CmdLineOptions& registered);

} // namespace host
