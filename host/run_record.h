#pragma once

#include "host/document_counts.h"
#include "host/exit_code.h"
#include "host/scene_contents.h"
#include "host/stage_clock.h"

#include "scene_image_record.h"

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
    Output written; ///< without files also if the run ended before
    base::vector<scene::ImageRecord> images;
    SceneCounts scene; ///< of a dry run
    base::vector<ObjectName> unexported;
    StageClock clock;
};

} // namespace host
