#include "host/messages.h"

#include "host/exit_code.h"
#include "host/paths.h"
#include "host/printing.h"

#include "b_string_convert.h"
#include "stream/b_fs.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <utility>

namespace host {

using base::string;
using base::string_view;
using base::vector;

namespace {

/// With these begin the messages that a file could not be written. Exporters go on then and report
/// success; closing a stream never throws.
constexpr string_view failedFileTexts[] = {
    "Unable to write the GLTF file!",
    "Couldn't write the image to external file!",
    "Couldn't write the binary buffer to external file!",
    "Unhandled exception while closing '",
};

/// Exporters remove their temporary files once more at the end, to be sure.
constexpr string_view harmlessText = "Unable to delete temporary file!";

bool isHarmless(string_view text) {
    return text.starts_with(harmlessText);
}

/// The standard error stream.
class Console final : public base::ICustomLog {
public:
    explicit Console(const HostOptions& options) : bar_(!options.quiet) {
        setLevelLimit(options.quiet          ? base::logError
                      : options.verbose == 0 ? base::logWarning
                      : options.verbose == 1 ? base::logInformation
                                             : base::logDebug);
    }

    void message(base::name_id, int level, string_view text) override {
        if (isHarmless(text))
            return;
        static constexpr const char* prefixes[] = {"", "error: ", "error: ", "warning: "};
        string line(programName);
        line.append(": ");
        if (level < static_cast<int>(std::size(prefixes)))
            line.append(prefixes[level]);
        // A line end in a name must not look like a message of its own.
        for (const char c : printable(base::trimmed(text)))
            line.append(c == '\n' ? "\n    " : string(1, c));
        line.append("\n");
        bar_.erase();
        print(stderr, line);
        bar_.redraw();
    }
    void progress(base::u32 percent, string_view text) override { bar_.draw(percent, text); }
    void progressEnd() override { bar_.end(); }

private:
    ProgressBar bar_;
};

Failure logFileFailure(const string& path, const char* reason) {
    return {ExitCode::output,
            base::format("{}: can't be opened for the log: {}, expected a file that can be "
                         "written.",
                         path, reason)};
}

} // namespace

string objectOf(string_view message) {
    // These tell of no object.
    if (message.starts_with("map attribute|") || message.starts_with("plugin factory"))
        return {};
    const std::size_t first = message.find('|');
    if (first == string_view::npos)
        return {};
    const string_view head = message.substr(0, first);
    string_view rest = message.substr(first + 1);
    const auto isMarkInText = [](string_view before) { return before.ends_with(' '); };
    if (!rest.starts_with(' ')) { // "subsystem |object| text"
        const std::size_t end = rest.find("| ");
        return end == string_view::npos ? string() : string(rest.substr(0, end));
    }
    if (isMarkInText(head))
        return {};
    rest.remove_prefix(1);
    const std::size_t second = rest.find("| ");
    if (second == string_view::npos || isMarkInText(rest.substr(0, second)))
        return string(head); // "object| text"
    return string(rest.substr(0, second));
}

class Messages::Record final : public base::ICustomLog {
public:
    Record() { setLevelLimit(base::logWarning); }

    void message(base::name_id messageChannel, int level, string_view text) override {
        if (level < base::logCritical || isHarmless(text))
            return;
        all.push_back({messageChannel, level, objectOf(text), string(text)});
    }
    void progress(base::u32, string_view) override {}
    void progressEnd() override {}

    vector<Message> all;
};

/// Holds the messages for a log file that is not open yet.
class Messages::Waiting final : public base::ICustomLog {
public:
    Waiting() { setLevelLimit(base::logDebug); }

    void message(base::name_id messageChannel, int level, string_view text) override {
        held_.push_back({messageChannel, level, {}, string(text)});
    }
    void progress(base::u32, string_view) override {}
    void progressEnd() override {}

    void passTo(base::ICustomLog& output) const {
        for (const Message& message : held_)
            output.message(message.channel, message.level, message.text);
    }

private:
    vector<Message> held_;
};

Messages::Messages(const HostOptions& options)
    : logPath_(options.logFile), record_(base::makeRef<Record>()) {
    base::log().setLevelLimit(options.verbose > 1 ? base::logDebug : base::logInformation);
    outputs_ = {record_, base::makeRef<Console>(options)};
    if (!logPath_.empty()) {
        waiting_ = base::makeRef<Waiting>();
        outputs_.push_back(waiting_);
    }
    for (const base::ref<base::ICustomLog>& output : std::as_const(outputs_))
        base::log().addOutput(output);
}

void Messages::openLogFile() {
    if (!waiting_)
        return;
    const base::ref<base::ICustomLog> file = makeFileOutput();
    file->setLevelLimit(base::logDebug); // the log's own limit decides
    waiting_->passTo(*file);
    base::log().removeOutput(waiting_.get());
    waiting_.reset();
    outputs_.data()[outputs_.size() - 1] = file;
    base::log().addOutput(file);
}

base::ref<base::ICustomLog> Messages::makeFileOutput() {
    checkOutput(logPath_);
    const string path = base::fs::master().resolve(logPath_);
    constexpr string_view htmlExtension = ".html";
    if (path.ends_with(htmlExtension)) {
        htmlLog_ = base::makeRef<base::HtmlLog>(path.substr(0, path.size() - htmlExtension.size()));
        if (htmlLog_->hasFailed())
            throw logFileFailure(logPath_, std::strerror(errno));
        return htmlLog_;
    }
    logFile_ = std::fopen(path.c_str(), "we");
    if (!logFile_)
        throw logFileFailure(logPath_, std::strerror(errno));
    return base::makeRef<base::StdLog>(path, logFile_);
}

Messages::~Messages() {
    close();
}

bool Messages::close() {
    for (const base::ref<base::ICustomLog>& output : std::as_const(outputs_))
        base::log().removeOutput(output.get());
    outputs_.clear();
    bool isWhole = !htmlLog_ || !htmlLog_->hasFailed();
    if (std::FILE* file = std::exchange(logFile_, nullptr)) {
        isWhole = std::ferror(file) == 0;
        isWhole &= std::fclose(file) == 0;
    }
    return isWhole;
}

const vector<Message>& Messages::all() const {
    return record_->all;
}

std::size_t Messages::countFailedFiles() const {
    const auto tells = [](const Message& message) {
        return std::ranges::any_of(
            failedFileTexts, [&](string_view begin) { return message.text.starts_with(begin); });
    };
    return static_cast<std::size_t>(std::ranges::count_if(record_->all, tells));
}

} // namespace host
