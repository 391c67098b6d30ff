#include "host/messages.h"

#include "host/exit_code.h"
#include "host/printing.h"

#include "b_string_convert.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <unistd.h>

namespace host {

using base::string;
using base::string_view;
using base::vector;

namespace {

/// With these an exporter begins the message that it could not write a file; it goes on then and
/// reports success.
constexpr string_view failedFileTexts[] = {
    "Unable to write the GLTF file!",
    "Couldn't write the image to external file!",
    "Couldn't write the binary buffer to external file!",
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
        line.append(printable(base::trimmed(text))).append("\n");
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
    const std::size_t first = message.find('|');
    if (first == string_view::npos)
        return {};
    const string_view rest = message.substr(first + 1);
    if (rest.starts_with(' ')) // "object| text", unless it is a mark within the text
        return first > 0 && message[first - 1] != ' ' ? string(message.substr(0, first)) : string();
    const std::size_t end = rest.find("| ");
    return end == string_view::npos ? string() : string(rest.substr(0, end));
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

Messages::Messages(const HostOptions& options) : record_(base::makeRef<Record>()) {
    base::log().setLevelLimit(options.verbose > 1 ? base::logDebug : base::logInformation);
    outputs_ = {record_, base::makeRef<Console>(options)};
    if (!options.logFile.empty())
        attachLogFile(options.logFile);
    for (const base::ref<base::ICustomLog>& output : std::as_const(outputs_))
        base::log().addOutput(output);
}

Messages::~Messages() {
    for (const base::ref<base::ICustomLog>& output : std::as_const(outputs_))
        base::log().removeOutput(output.get());
    outputs_.clear();
    if (logFile_)
        std::fclose(logFile_);
}

void Messages::attachLogFile(const string& path) {
    constexpr string_view htmlExtension = ".html";
    if (path.ends_with(htmlExtension)) {
        outputs_.push_back(
            base::makeRef<base::HtmlLog>(path.substr(0, path.size() - htmlExtension.size())));
        if (access(path.c_str(), W_OK) != 0)
            throw logFileFailure(path, std::strerror(errno));
    } else {
        logFile_ = std::fopen(path.c_str(), "we");
        if (!logFile_)
            throw logFileFailure(path, std::strerror(errno));
        outputs_.push_back(base::makeRef<base::StdLog>(path, logFile_));
    }
    outputs_.cend()[-1]->setLevelLimit(base::logDebug); // the log's own limit decides
}

const vector<Message>& Messages::all() const {
    return record_->all;
}

bool Messages::tellFailedFile() const {
    return std::ranges::any_of(record_->all, [](const Message& message) {
        return std::ranges::any_of(
            failedFileTexts, [&](string_view begin) { return message.text.starts_with(begin); });
    });
}

} // namespace host
