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
    explicit Messages(const HostOptions& options);
    ~Messages();
    Messages(const Messages&) = delete;
    Messages& operator=(const Messages&) = delete;

    /// Opens the file that --log names, if any, for the messages so far and those to come: once
    /// the command line has turned out right, since what the file held is lost. Throws `Failure` if
    /// it can't be written.
    void openLogFile();

    const base::vector<Message>& all() const;
    /// Number of messages that tell that an output file could not be written.
    std::size_t countFailedFiles() const;
    /// Detaches the outputs and closes the log file. False if that could not be written whole.
    bool close();

private:
    class Record;
    class Waiting;
    base::ref<base::ICustomLog> makeFileOutput();

    base::string logPath_;
    base::ref<Record> record_;
    base::ref<Waiting> waiting_; ///< until the log file is open
    base::vector<base::ref<base::ICustomLog>> outputs_;
    std::FILE* logFile_ = nullptr; ///< of the plain text form
    base::ref<base::HtmlLog> htmlLog_;
};

} // namespace host
