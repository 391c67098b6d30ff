#include "measure.h"

#include <fstream>
#include <spawn.h>
#include <stdexcept>
#include <sys/resource.h>
#include <sys/wait.h>

/// The program as a process, from its start to its end.
namespace bench {

namespace {

/// A square of 4 by 4 fields of two triangles, with normals and texture coordinates.
void writeModel(const std::string& path) {
    constexpr int size = 4, lineLength = size + 1;
    std::ofstream file(path);
    for (int i = 0; i < lineLength * lineLength; ++i) {
        file << "v " << i % lineLength << ' ' << i / lineLength << " 0\n";
        file << "vt " << 0.25 * (i % lineLength) << ' ' << 0.25 * (i / lineLength) << '\n';
    }
    file << "vn 0 0 1\n";
    const auto corner = [&](int vertex) { file << ' ' << vertex << '/' << vertex << "/1"; };
    for (int y = 0; y < size; ++y) {
        for (int x = 0; x < size; ++x) {
            const int first = y * lineLength + x + 1, above = first + lineLength;
            for (const int second : {0, 1}) {
                file << 'f';
                corner(first);
                corner(second ? above + 1 : first + 1);
                corner(second ? above : above + 1);
                file << '\n';
            }
        }
    }
}

double secondsOf(const timeval& time) {
    return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_usec) * 1e-6;
}

/// What the system tells of the program's run. Its memory is at least that of the process which
/// starts it, so this one must stay small.
rusage runProgram(std::string input, std::string output) {
    std::string program = PROGRAM, quiet = "--quiet";
    char* arguments[] = {program.data(), quiet.data(), input.data(), output.data(), nullptr};
    pid_t process = 0;
    int status = 0;
    rusage usage{};
    if (posix_spawn(&process, PROGRAM, nullptr, nullptr, arguments, environ) != 0 ||
        wait4(process, &status, 0, &usage) != process || status != 0)
        throw std::runtime_error("the program failed");
    return usage;
}

void host(benchmark::State& state) {
    const OutputFolder folder;
    writeModel(folder / "model.obj");
    for (auto _ : state) {
        const rusage usage = runProgram(folder / "model.obj", folder / "model.glb");
        const double seconds = secondsOf(usage.ru_utime) + secondsOf(usage.ru_stime);
        state.SetIterationTime(seconds);
        state.counters["seconds"] = seconds;
        state.counters["peak"] = static_cast<double>(usage.ru_maxrss) * 1024;
        state.counters["launcher"] = static_cast<double>(peakMemory());
    }
}

BENCH_ROW(host, "host/small");

} // namespace

} // namespace bench
