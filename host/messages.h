#pragma once

#include "host/options.h"
#include "host/progress.h"

#include "b_log.h"

/// What the program does with the messages of the log: it shows them, keeps those that count for
/// the exit code and the report, and writes them to the file that --log names.
namespace host {

/// A warning or an error.
struct Message {
    base::name_id channel;
    int level;
    base::string object; ///< the name of what it is about; empty if it does not tell
    base::string text;
};

/// The object of a message of the form "subsystem |object| text", "subsystem| object| text" or
/// "object| text"; empty for others.
base::string objectOf(base::string_view message);

/// Attaches the outputs to the log while it lives. Messages of level 1 to 3 are kept, except the
/// one about a temporary file that is removed twice, which counts nowhere.
class Messages {
public:
    /// Throws `Failure` if the log file can't be written.
    explicit Messages(const HostOptions& options);
    ~Messages();
    Messages(const Messages&) = delete;
    Messages& operator=(const Messages&) = delete;

    const base::vector<Message>& all() const;
    /// Number of messages that tell that an output file could not be written.
    std::size_t countFailedFiles() const;
    /// Detaches the outputs and closes the log file. False if that could not be written whole.
    bool close();

private:
    class Record;
    void attachLogFile(const base::string& givenPath);

    base::ref<Record> record_;
    base::vector<base::ref<base::ICustomLog>> outputs_;
    std::FILE* logFile_ = nullptr; ///< of the plain text form
    base::ref<base::HtmlLog> htmlLog_;
};

} // namespace host
