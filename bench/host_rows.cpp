#include "measure.h"

#include <fstream>
#include <spawn.h>
#include <stdexcept>
#include <sys/resource.h>
#include <sys/wait.h>

/// The program as a process, from its start to its end.
namespace bench {

namespace {

constexpr int size = 4, lineLength = size + 1; ///< a square of 4 by 4 fields of two triangles

/// Calls `function` with the numbers of the vertices of each triangle, from 0 on.
template <class Function>
void forEachTriangle(const Function& function) {
    for (int y = 0; y < size; ++y) {
        for (int x = 0; x < size; ++x) {
            const int first = y * lineLength + x, above = first + lineLength;
            function(first, first + 1, above + 1);
            function(first, above + 1, above);
        }
    }
}

void writePly(const std::string& path) {
    std::ofstream file(path);
    file << "ply\nformat ascii 1.0\nelement vertex " << lineLength * lineLength
         << "\nproperty float x\nproperty float y\nproperty float z\nproperty float nx\n"
            "property float ny\nproperty float nz\nproperty float s\nproperty float t\n"
            "element face "
         << 2 * size * size << "\nproperty list uchar int vertex_indices\nend_header\n";
    for (int i = 0; i < lineLength * lineLength; ++i)
        file << i % lineLength << ' ' << i / lineLength << " 0 0 0 1 " << 0.25 * (i % lineLength)
             << ' ' << 0.25 * (i / lineLength) << '\n';
    forEachTriangle(
        [&](int a, int b, int c) { file << "3 " << a << ' ' << b << ' ' << c << '\n'; });
}

void writeObj(const std::string& path) {
    std::ofstream file(path);
    for (int i = 0; i < lineLength * lineLength; ++i) {
        file << "v " << i % lineLength << ' ' << i / lineLength << " 0\n";
        file << "vt " << 0.25 * (i % lineLength) << ' ' << 0.25 * (i / lineLength) << '\n';
    }
    file << "vn 0 0 1\n";
    forEachTriangle([&](int a, int b, int c) {
        file << 'f';
        for (const int corner : {a + 1, b + 1, c + 1})
            file << ' ' << corner << '/' << corner << "/1";
        file << '\n';
    });
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

void runOn(benchmark::State& state, const std::string& model, const std::string& output) {
    for (auto _ : state) {
        const rusage usage = runProgram(model, output);
        const double seconds = secondsOf(usage.ru_utime) + secondsOf(usage.ru_stime);
        state.SetIterationTime(seconds);
        state.counters["seconds"] = seconds;
        state.counters["peak"] = static_cast<double>(usage.ru_maxrss) * 1024;
        state.counters["launcher"] = static_cast<double>(peakMemory());
    }
}

void hostPly(benchmark::State& state) {
    const OutputFolder folder;
    writePly(folder / "model.ply");
    runOn(state, folder / "model.ply", folder / "model.glb");
}

void hostObj(benchmark::State& state) {
    const OutputFolder folder;
    writeObj(folder / "model.obj");
    runOn(state, folder / "model.obj", folder / "model.glb");
}

BENCH_ROW(hostPly, "host/ply");
BENCH_ROW(hostObj, "host/obj");

} // namespace

} // namespace bench
