#pragma once

#include "host/run_record.h"

namespace host {

/// The line that tells what has been done, or of a dry run what would be.
base::string summaryLine(const RunRecord& record);

} // namespace host
