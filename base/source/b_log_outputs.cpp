#include "b_log.h"

#include "stream/b_fs.h"

#include <algorithm>
#include <array>
#include <ctime>
#include <sys/stat.h>
#include <unistd.h>

namespace base {

namespace {

/// How a level looks in the outputs.
struct LevelStyle {
    const char* terminalColor; ///< escape sequence
    const char* prefix;
    const char* cssClass;
};

constexpr std::array<LevelStyle, 6> levelStyles = {{
    {"\x1b[92m", "", "text"},
    {"\x1b[97m", "[crit] ", "crit"},
    {"\x1b[96m", "[erro] ", "err"},
    {"\x1b[31m", "[warn] ", "warn"},
    {"\x1b[33m", "[info] ", "info"},
    {"\x1b[36m", "[debg] ", "debug"},
}};
constexpr const char* terminalReset = "\x1b[0m";

const LevelStyle& levelStyle(int level) {
    return levelStyles[static_cast<std::size_t>(std::clamp<int>(level, logText, logDebug))];
}

/// Local time as HH:MM:SS.
string timeText() {
    const std::time_t now = std::time(nullptr);
    std::tm parts{};
    localtime_r(&now, &parts);
    char text[16];
    return string(text, std::strftime(text, sizeof text, "%H:%M:%S", &parts));
}

void write(std::FILE* file, string_view text) {
    std::fwrite(text.data(), 1, text.size(), file);
}

string escapedHtml(string_view text) {
    string out;
    out.reserve(text.size());
    for (const char c : text) {
        if (c == '&')
            out.append("&amp;");
        else if (c == '<')
            out.append("&lt;");
        else if (c == '>')
            out.append("&gt;");
        else
            out.push_back(c);
    }
    return out;
}

/// Opens `path`; null, with a line on the standard error stream, if that fails.
std::FILE* openForWriting(const string& path, const char* mode) {
    std::FILE* file = std::fopen(path.c_str(), mode);
    if (!file)
        std::fprintf(stderr, "Cannot open '%s' for writing!\n", path.c_str());
    return file;
}

/// Moves a regular file away; folders and devices are not ours to move.
void backUp(const string& path, const string& backupPath) {
    struct stat status {};
    if (stat(path.c_str(), &status) == 0 && S_ISREG(status.st_mode) &&
        std::rename(path.c_str(), backupPath.c_str()) != 0)
        std::fputs("Failed to backup the old log file!\n", stderr);
}

void writeHtmlHead(std::FILE* file, string_view stem) {
    write(file, "<html>\n<head>\n"
                "<meta http-equiv=\"Content-Type\" content=\"text/html; charset=utf-8\">\n"
                "<title>Application Log</title>\n"
                "<style type=\"text/css\">\n"
                "body { background: #000; color: #bbb; font-family: monospace; }\n"
                "pre { margin: 0; font-family: inherit; white-space: pre-wrap; }\n"
                "td { vertical-align: top; }\n"
                ".box { border: 1px solid #444; padding: 4px; }\n"
                ".time { width: 8em; color: #777; }\n"
                ".text { color: #5d5; }\n"
                ".crit { color: #fff; background: #800; }\n"
                ".err { color: #f66; }\n"
                ".warn { color: #fd6; }\n"
                ".info { color: #bbb; }\n"
                ".debug { color: #6bb; }\n"
                "</style>\n"
                "</head>\n\n"
                "<body>\n");
    write(file, "<h2>" + escapedHtml(stem) + " log</h2>\n");
    write(file, "<div>Compilation date " __DATE__ "</div>\n"
                "<div class=\"box\">\n"
                "<table width=\"100%\">\n");
}

} // namespace

StdLog::StdLog(const string& name, std::FILE* file)
    : file_(file ? file : openForWriting(name + ".log", "we")), ownsFile_(!file),
      terminal_(file_ && isatty(fileno(file_)) != 0) {
    if (!file_)
        return;
    std::fprintf(file_, "Build from %s %s\n", __DATE__, __TIME__);
    std::fflush(file_);
}

StdLog::~StdLog() {
    if (file_ && ownsFile_)
        std::fclose(file_);
}

void StdLog::message(name_id messageChannel, int level, string_view text) {
    if (!file_ || !takes(messageChannel, level))
        return;
    const LevelStyle& style = levelStyle(level);
    string line = terminal_ ? style.terminalColor : "";
    line.append(timeText()).append(" ");
    if (levelPrefix)
        line.append(style.prefix);
    line.append(2 * std::size_t{indent}, ' ').append(text);
    if (terminal_)
        line.append(terminalReset);
    line.push_back('\n');
    write(file_, line);
    std::fflush(file_);
}

void StdLog::progress(u32, string_view) {}

void StdLog::progressEnd() {}

HtmlLog::HtmlLog(const string& name) {
    const string path = name + ".html";
    backUp(path, name + "-old.html");
    // Appending keeps an old log that could not be moved away.
    file_ = openForWriting(path, "ae");
    failed_ = !file_;
    if (failed_)
        return;
    std::fseek(file_, 0, SEEK_END);
    if (std::ftell(file_) == 0)
        writeHtmlHead(file_, fs::stem(path));
    std::fflush(file_);
}

HtmlLog::~HtmlLog() {
    HtmlLog::finish();
}

void HtmlLog::message(name_id messageChannel, int level, string_view text) {
    if (!file_ || !takes(messageChannel, level))
        return;
    string row = "<tr>\n<td class=\"time\">" + timeText() + "</td>\n<td class=\"";
    row.append(levelStyle(level).cssClass).append("\"><pre>");
    row.append(2 * std::size_t{indent}, ' ')
        .append(escapedHtml(text))
        .append("</pre></td>\n</tr>\n");
    write(file_, row);
    std::fflush(file_);
}

void HtmlLog::progress(u32, string_view) {}

void HtmlLog::progressEnd() {}

void HtmlLog::finish() {
    if (!file_)
        return;
    write(file_, "</table>\n</div><div>Terminated at " + timeText() + "</div>\n");
    failed_ = std::ferror(file_) != 0;
    failed_ |= std::fclose(file_) != 0;
    file_ = nullptr;
}

StdLog& console() {
    // The reference keeps it alive when it is attached and removed again.
    static const ref<StdLog>& instance = *new ref<StdLog>(new StdLog("console", stderr));
    return *instance;
}

} // namespace base
