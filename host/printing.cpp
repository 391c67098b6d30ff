#include "host/printing.h"

namespace host {

base::string printable(base::string_view text) {
    base::string out(text);
    for (char& c : out) {
        const bool isControl = (c >= 0 && c < 0x20 && c != '\n' && c != '\t') || c == 0x7f;
        if (isControl)
            c = '?';
    }
    return out;
}

void printError(base::string_view text) {
    base::string line(programName);
    line.append(": error: ").append(printable(text)).append("\n");
    print(stderr, line);
}

} // namespace host
