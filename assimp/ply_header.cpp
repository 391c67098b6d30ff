#include "assimp/ply_header.h"

#include "b_string_convert.h"
#include "stream/b_fs.h"

#include <algorithm>

namespace assimp {

namespace {

base::string readStart(const base::string& path, std::size_t byteCount) {
    base::Stream stream;
    base::fs::master().open(stream, path, base::fs::openRead);
    base::string start(byteCount, '\0');
    start.resize(stream.read(start.data(), byteCount));
    return start;
}

} // namespace

bool isPlyHeaderWhole(const base::string& path) {
    constexpr std::size_t longest = std::size_t(1) << 20;
    if (base::toLower(base::fs::extension(path)) != "ply")
        return true;
    const base::string header = readStart(path, longest);
    base::string_view rest = header;
    while (!rest.empty()) {
        const std::size_t end = std::min(rest.find_first_of("\r\n"), rest.size());
        if (base::trimmed(rest.substr(0, end)) == "end_header")
            return true;
        rest.remove_prefix(std::min(end + 1, rest.size()));
    }
    return false;
}

} // namespace assimp
