#include "host/progress.h"

#include "host/printing.h"

#include <algorithm>
#include <unistd.h>

namespace host {

namespace {

constexpr const char* eraseLine = "\r\x1b[K";
constexpr std::size_t barWidth = 24;
constexpr std::size_t textWidth = 44; // with the bar it fits into 80 columns

/// At most `textWidth` bytes of the text, cut between characters.
base::string_view shortened(base::string_view text) {
    if (text.size() <= textWidth)
        return text;
    std::size_t end = textWidth;
    const auto continues = [&](std::size_t at) { return (text[at] & 0xc0) == 0x80; };
    while (end > 0 && continues(end))
        --end;
    return text.substr(0, end);
}

} // namespace

ProgressBar::ProgressBar(bool wanted) : active_(wanted && isatty(STDERR_FILENO) != 0) {}

void ProgressBar::draw(base::u32 percent, base::string_view text) {
    if (!active_)
        return;
    const std::size_t filled = barWidth * std::min(percent, 100u) / 100;
    line_ = eraseLine;
    line_.append("[").append(filled, '#').append(barWidth - filled, ' ').append("] ");
    line_.append(printable(shortened(text)));
    redraw();
}

void ProgressBar::erase() {
    if (!line_.empty())
        print(stderr, eraseLine);
}

void ProgressBar::redraw() {
    if (!line_.empty())
        print(stderr, line_);
}

void ProgressBar::end() {
    erase();
    line_.clear();
}

} // namespace host
