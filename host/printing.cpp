#include "host/printing.h"

#include "b_types.h"

namespace host {

base::string printable(base::string_view text) {
    base::string out(text);
    for (std::size_t i = 0; i < out.size(); ++i) {
        const auto byte = static_cast<base::u8>(out[i]);
        if ((byte < 0x20 && byte != '\n' && byte != '\t') || byte == 0x7f)
            out[i] = '?';
        else if (i > 0 && out[i - 1] == '\xC2' && byte >= 0x80 && byte < 0xA0) // C1 in UTF-8
            out[i - 1] = out[i] = '?';
    }
    return out;
}

void printError(base::string_view text) {
    base::string line(programName);
    line.append(": error: ").append(printable(text)).append("\n");
    print(stderr, line);
}

} // namespace host
