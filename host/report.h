#pragma once

#include "host/messages.h"
#include "host/run_record.h"

namespace host {

/// The JSON text of the report. `registered` tells the words for the values of settings.
base::string reportText(const RunRecord& record, const base::vector<Message>& messages,
                        const base::CmdLineOptions& registered);

} // namespace host
