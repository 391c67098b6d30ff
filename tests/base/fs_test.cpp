#include "stream/b_fs.h"

#include "stream/b_stream_workers.h"
#include "stream/b_temporary_folder.h"

#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <functional>
#include <gtest/gtest.h>
#include <sstream>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/time.h>
#include <sys/wait.h>
#include <unistd.h>

namespace base::fs {
namespace {

namespace stdfs = std::filesystem;

/// What a call throws: "not found", "argument", "unsupported", "api CODE", another's text, or
/// "done".
string outcome(const std::function<void()>& call) {
    try {
        call();
    } catch (const file_not_found&) {
        return "not found";
    } catch (const invalid_argument&) {
        return "argument";
    } catch (const unsupported_interface&) {
        return "unsupported";
    } catch (const api_exception& error) {
        return "api " + std::to_string(error.code());
    } catch (const exception& error) {
        return error.what();
    }
    return "done";
}

string api(int code) {
    return "api " + std::to_string(code);
}

class FsTest : public testing::Test {
protected:
    FsTest() { stdfs::create_directories(folder_); }
    void TearDown() override { stdfs::remove_all(folder_); }

    string path(const string& name) const { return folder_ + name; }
    void put(const string& name, string_view text) { std::ofstream(path(name)) << text; }
    string contentOf(const string& name) const {
        std::ostringstream text;
        text << std::ifstream(path(name)).rdbuf();
        return text.str();
    }
    static Stream opened(const string& path, u32 mode) {
        Stream stream;
        master().open(stream, path, mode);
        return stream;
    }

    const string folder_ = testing::TempDir() + "fs_test_" + std::to_string(getpid()) + "/";
};

TEST(FsPath, TakesNamesApart) {
    const struct {
        string_view path, folder, name, stem, extension, longStem, longExtension;
    } rows[] = {{"a/b/c.tar.gz", "a/b/", "c.tar.gz", "c.tar", "gz", "c", "tar.gz"},
                {"../tex/a.png", "../tex/", "a.png", "a", "png", "a", "png"},
                {"/proj.v1/a", "/proj.v1/", "a", "a", "", "a", ""},
                {"C:\\x.y\\b.c", "C:\\x.y\\", "b.c", "b", "c", "b", "c"},
                {"a\\b/", "a\\b/", "", "", "", "", ""},
                {".hidden", "", ".hidden", "", "hidden", "", "hidden"},
                {"a..b", "", "a..b", "a.", "b", "a", ".b"},
                {"end.", "", "end.", "end", "", "end", ""},
                {"", "", "", "", "", "", ""}};
    for (const auto& row : rows) {
        EXPECT_EQ(folder(row.path), row.folder) << row.path;
        EXPECT_EQ(fileName(row.path), row.name) << row.path;
        EXPECT_EQ(stem(row.path), row.stem) << row.path;
        EXPECT_EQ(extension(row.path), row.extension) << row.path;
        EXPECT_EQ(stem(row.path, 1), row.longStem) << row.path;
        EXPECT_EQ(extension(row.path, 1), row.longExtension) << row.path;
    }
    EXPECT_EQ(extension("a.b.c.d", 2), "b.c.d");
    EXPECT_EQ(extension("a.b.c.d", 99), "b.c.d");
    EXPECT_EQ(stem("a.b.c.d", 99), "a");
}

using Row = std::pair<string_view, string_view>;

TEST(FsPath, NormalizesAndJoins) {
    const Row normal[] = {{"", ""},
                          {".", "."},
                          {"/", "/"},
                          {"..", ".."},
                          {"...", "..."},
                          {"\\\\a\\b", "/a/b"},
                          {"a//b", "a/b"},
                          {"./a/./b/", "a/b/"},
                          {"a/b/..", "a"},
                          {"a/..", "."},
                          {"a/../", "./"},
                          {"../../a", "../../a"},
                          {"/../a", "/a"},
                          {"/a/..", "/"},
                          {"a/../../b", "../b"},
                          {"a/.b/..c", "a/.b/..c"}};
    for (const auto& [path, expected] : normal)
        EXPECT_EQ(normalized(path), expected) << path;

    struct Join {
        string_view folder, name, expected;
    };
    const Join joins[] = {{"a", "b", "a/b"},
                          {"a/", "b", "a/b"},
                          {"a\\", "b", "a\\b"},
                          {"a//", "b", "a/b"},
                          {"", "b", "b"},
                          {"/", "b", "/b"},
                          {"a", "/b", "/b"},
                          {"a", "\\b", "\\b"},
                          {"a", "file:///b", "file:///b"},
                          {"a", "C:\\b", "C:\\b"},
                          {"a", "tex:/b", "tex:/b"},
                          {"a", "x:y", "a/x:y"},
                          {"a", "", "a/"}};
    for (const auto& [folder, name, expected] : joins)
        EXPECT_EQ(joined(folder, name), expected) << folder << " + " << name;
}

TEST(FsPath, ReplacesAliases) {
    aliases().set("assets", "/data/assets/");
    aliases().set("skins:", "assets:/chars\\skins");
    aliases().set("loop", "loop/x");
    aliases().set("", "never");
    const std::pair<string, string> rows[] = {
        {"assets/a.png", "/data/assets/a.png"},
        {"assets:\\a.png", "/data/assets/a.png"},
        {"file://skins:/b/../c", "/data/assets/chars/skins/c"},
        {"file:///tmp//x", "/tmp/x"},
        {"/assets/a", "/assets/a"},
        {"assetsx/a", "assetsx/a"},
        {"assets/a:/x", "/data/assets/a:/x"},
        {"assets", "/data/assets/"},
        {"loop", "loop/x/x/x/x/x/x/x/x/x/x/x/x/x/x/x/x"}};
    for (const auto& [path, expected] : rows)
        EXPECT_EQ(master().resolve(path), expected) << path;
    EXPECT_TRUE(aliases().remove("assets:"));
    EXPECT_FALSE(aliases().remove("assets"));
    EXPECT_EQ(master().resolve("assets/a"), "assets/a");
    aliases().remove("skins");
    aliases().remove("loop");
}

TEST_F(FsTest, OpensByMode) {
    constexpr u32 reads = openRead, both = openRead | openWrite;
    const struct {
        u32 mode;
        string missing, existing; ///< outcomes
        string left;              ///< of the existing file's "12345", once "ab" was written
    } rows[] = {{reads, "not found", "done", "12345"},
                {openWrite, "done", "done", "ab345"},
                {both, "not found", "done", "ab345"},
                {both | openTruncate, "not found", "done", "ab"},
                {both | openCreate, "done", "done", "ab345"},
                {both | openCreate | openTruncate, "done", "done", "ab"},
                {openReplace, "done", "done", "ab"},
                {openReplace | openShareRead | openShareWrite, "done", "done", "ab"},
                {reads | openTruncate, api(EINVAL), api(EINVAL), "12345"},
                {openCreate, api(EINVAL), api(EINVAL), "12345"},
                {openReplace | 128, "unsupported", "unsupported", "12345"}};
    for (const auto& row : rows) {
        stdfs::remove(path("new"));
        EXPECT_EQ(outcome([&] { opened(path("new"), row.mode); }), row.missing) << row.mode;
        EXPECT_EQ(stdfs::exists(path("new")), row.missing == "done") << row.mode;
        put("old", "12345");
        EXPECT_EQ(outcome([&] {
                      Stream stream = opened(path("old"), row.mode);
                      EXPECT_EQ(stream.capabilities(), 652 | (row.mode & both));
                      if ((row.mode & openTruncate) != 0) {
                          EXPECT_EQ(stdfs::file_size(path("old")), 0u);
                      }
                      if ((row.mode & openWrite) != 0)
                          stream.write("ab", 2);
                  }),
                  row.existing)
            << row.mode;
        EXPECT_EQ(contentOf("old"), row.left) << row.mode;
    }
}

TEST_F(FsTest, RefusesWhatIsNoFile) {
    put("file", "x");
    const struct {
        string path;
        u32 mode;
        string expected;
    } rows[] = {{"", openRead, "argument"},
                {"file://", openReplace, "argument"},
                {path("file") + string("\0.png", 5), openRead, "argument"},
                {folder_, openRead, api(EISDIR)},
                {folder_, openReplace, api(EISDIR)},
                {path("file/below"), openRead, "not found"},
                {path("file/below"), openReplace, api(ENOTDIR)},
                {path("none/below"), openReplace, api(ENOENT)}};
    for (const auto& row : rows) {
        Stream kept = memStream(1);
        EXPECT_EQ(outcome([&] { master().open(kept, row.path, row.mode); }), row.expected)
            << row.path;
        EXPECT_EQ(kept.capabilities(), growingMemoryCapabilities);
    }
}

TEST_F(FsTest, FileStreamsKeepTheRulesOfStreams) {
    const u32 mode = openRead | openWrite | openCreate;
    Stream stream = opened(path("file"), mode);
    EXPECT_EQ(stream.name(), path("file"));
    stream.write("0123456789", 10);
    EXPECT_TRUE(stream.atEnd());
    EXPECT_EQ(stream.setPosition(-3, StreamOrigin::current), 7u);
    EXPECT_EQ(stream.setPosition(100, StreamOrigin::end), 10u);
    EXPECT_EQ(stream.setPosition(std::numeric_limits<i64>::min(), StreamOrigin::current), 0u);
    EXPECT_THROW(stream.setPosition(0, static_cast<StreamOrigin>(9)), switch_exception);
    char bytes[20];
    EXPECT_EQ(stream.read(bytes, 20), 10u);
    stream.setSize(4);
    EXPECT_EQ(stream.position(), 4u);
    stream.setSize(6);
    stream.flush();
    EXPECT_EQ(contentOf("file"), string("0123\0\0", 6));

    EXPECT_TRUE(master().remove(path("file")));
    Stream second = stream.clone();
    EXPECT_EQ(second.read(bytes, 20), 6u);
    EXPECT_EQ(stream.position(), 4u);

    put("other", "x");
    Stream reader = opened(path("other"), openRead);
    EXPECT_THROW(reader.write("a", 1), unsupported_interface);
    EXPECT_THROW(opened(path("other"), openWrite).read(bytes, 1), unsupported_interface);
}

TEST_F(FsTest, FullDisksGiveShortCounts) {
    Stream device = opened("/dev/full", openReplace);
    EXPECT_EQ(device.write("abc", 3), 0u);
    device.setFlags(streamThrowOnShortWrite);
    EXPECT_EQ(outcome([&] { device.write("abc", 3); }),
              "stream '/dev/full': trying to write 3 bytes, written 0 bytes");

    // Some of the write succeeds, as on a disk that fills up.
    rlimit before{};
    getrlimit(RLIMIT_FSIZE, &before);
    const auto handler = std::signal(SIGXFSZ, SIG_IGN);
    const rlimit limited{1000, before.rlim_max};
    setrlimit(RLIMIT_FSIZE, &limited);
    Stream stream = opened(path("cut"), openReplace);
    const string data(3000, 'x');
    const u64 written = stream.write(data.data(), data.size());
    setrlimit(RLIMIT_FSIZE, &before);
    std::signal(SIGXFSZ, handler);
    EXPECT_EQ(written, 1000u);
    EXPECT_EQ(contentOf("cut").size(), 1000u);
}

TEST_F(FsTest, TransfersGoOnAfterPartialOnes) {
    // A pipe holds less than the write, and signals interrupt both sides.
    const string pipe = path("pipe");
    ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
    struct sigaction quiet {
    }, before{};
    quiet.sa_handler = [](int) {}; // without SA_RESTART
    sigaction(SIGALRM, &quiet, &before);
    const string data = [] {
        string text;
        for (int i = 0; i < 100'000; ++i)
            text += std::to_string(i);
        return text;
    }();
    const pid_t child = fork();
    const itimerval often{{0, 200}, {0, 200}}, never{};
    setitimer(ITIMER_REAL, &often, nullptr);
    if (child == 0) {
        Stream writer = opened(pipe, openWrite);
        _exit(writer.write(data.data(), data.size()) == data.size() ? 0 : 1);
    }
    Stream reader = opened(pipe, openRead);
    string received(data.size(), '?');
    const u64 got = reader.read(received.data(), received.size());
    setitimer(ITIMER_REAL, &never, nullptr);
    int status = 1;
    waitpid(child, &status, 0);
    sigaction(SIGALRM, &before, nullptr);
    EXPECT_EQ(status, 0);
    EXPECT_EQ(got, data.size());
    EXPECT_TRUE(received == data);
}

TEST_F(FsTest, RemovesRenamesAndCopies) {
    put("a", "content");
    stdfs::create_directory(path("sub"));
    put("sub/b", "x");
    EXPECT_FALSE(master().remove(path("none")));
    EXPECT_FALSE(master().remove(path("sub")));
    EXPECT_TRUE(master().exists(path("sub\\b")));
    EXPECT_TRUE(master().remove("file://" + path("sub/b")));
    EXPECT_EQ(outcome([&] { master().copy(path("a"), path("./a")); }), api(EEXIST));
    EXPECT_EQ(contentOf("a"), "content");
    put("b", "longer than the other");
    master().copy(path("a"), path("b"));
    EXPECT_EQ(contentOf("b"), "content");
    master().rename(path("b"), path("c"));
    EXPECT_FALSE(master().exists(path("b")));
    EXPECT_EQ(outcome([&] { master().rename(path("b"), path("c")); }), api(ENOENT));
    EXPECT_EQ(contentOf("c"), "content");

    stdfs::create_symlink("c", path("link"));
    EXPECT_EQ(master().readLink(path("link")), "c");
    EXPECT_EQ(outcome([&] { master().readLink(path("c")); }), api(EINVAL));
    master().mkdir(path("made"));
    master().mkdir(path("made"));
    EXPECT_EQ(outcome([&] { master().mkdir(path("c/d")); }), api(ENOTDIR));
    master().touch(path("made/touched"));
    EXPECT_TRUE(stdfs::is_empty(path("made/touched")));
}

TEST_F(FsTest, ListsByPattern) {
    for (const char* name : {"scene_b.so", "scene_a.so", "Scene_c.so", "scene_.so.1", "\xC3\xA9.x"})
        put(name, "");
    stdfs::create_directory(path("scene_d.so"));
    const std::pair<string, vector<string>> rows[] = {
        {"scene_*.so", {"scene_a.so", "scene_b.so"}},
        {"scene_?.so", {"scene_a.so", "scene_b.so"}},
        {"*s*_*.so*", {"scene_.so.1", "scene_a.so", "scene_b.so"}},
        {"?.x", {"\xC3\xA9.x"}},
        {"*", {"Scene_c.so", "scene_.so.1", "scene_a.so", "scene_b.so", "\xC3\xA9.x"}},
        {"scene_b.so", {"scene_b.so"}},
        {"", {}}};
    for (const auto& [pattern, names] : rows)
        EXPECT_EQ(master().findFiles(folder_, pattern), names) << pattern;
    EXPECT_EQ(master().findFolders(folder_, "*"), vector<string>{"scene_d.so"});
    EXPECT_TRUE(master().findFiles(path("none"), "*").empty());
}

TEST_F(FsTest, MakesTemporaryNames) {
    const string first = tmpFilename(folder_, "pack");
    const string second = tmpFilename(folder_, "pack");
    EXPECT_NE(first, second);
    EXPECT_TRUE(first.starts_with(folder_ + "pack")) << first;
    struct stat status {};
    ASSERT_EQ(stat(first.c_str(), &status), 0);
    EXPECT_EQ(status.st_size, 0);
    EXPECT_EQ(status.st_mode & 0777, 0600u);
    EXPECT_EQ(outcome([&] { tmpFilename(path("none")); }), api(ENOENT));

    setenv("TMPDIR", path("").c_str(), 1);
    EXPECT_EQ(tmpPath(), folder_);
    setenv("TMPDIR", "/usr", 1);
    EXPECT_EQ(tmpPath(), "/usr/");
    setenv("TMPDIR", first.c_str(), 1);
    EXPECT_EQ(outcome([] { tmpPath(); }), api(ENOTDIR));
    unsetenv("TMPDIR");
    EXPECT_EQ(tmpPath(), "/tmp/");
}

TEST_F(FsTest, TemporaryFoldersEndWithTheirFiles) {
    setenv("TMPDIR", folder_.c_str(), 1);
    string first;
    {
        const TemporaryFolder one("made"), two("made");
        first = one.path();
        EXPECT_NE(first, two.path());
        EXPECT_TRUE(first.starts_with(folder_ + "made") && first.ends_with('/')) << first;
        EXPECT_EQ(stdfs::status(first).permissions(), stdfs::perms::owner_all);
        stdfs::create_directories(first + "sub/sub");
        std::ofstream(first + "sub/file") << "x";
    }
    EXPECT_TRUE(stdfs::is_empty(folder_));
    for (const string& place : {path("none"), string("/proc")}) {
        setenv("TMPDIR", place.c_str(), 1);
        EXPECT_EQ(outcome([] { TemporaryFolder(); }), api(ENOENT)) << place;
    }
    unsetenv("TMPDIR");
}

/// Owns what lies under "vault/" and offers little.
class VaultFS final : public IPlugin {
public:
    using IPlugin::IPlugin;
    bool owns(const string& path) override { return path.starts_with("vault/"); }
    void open(Stream& stream, const string& path, u32) override {
        stream = memStreamView(nullptr, 0, path);
    }
    bool exists(const string&) override { return true; }
    vector<string> findFiles(const string&, const string&) override { return {"found"}; }
    vector<string> findFolders(const string&, const string&) override { return {}; }
};

TEST_F(FsTest, SendsRequestsToTheOwner) {
    struct Desc final : IPluginDesc {
        base::IPlugin* create(PluginFactory& factory, u32 id) override {
            return new VaultFS(ref<IPluginDesc>(this), &factory, id);
        }
    };
    EXPECT_EQ(outcome([] { master().attachFS("NoFS"); }),
              "file system with name NoFS can't be found");
    const auto desc = makeRef<Desc>();
    desc->type = nameServer().id("VaultFS");
    master().factory().registerDesc(desc);
    master().attachFS("VaultFS");
    EXPECT_TRUE(master().exists("vault\\anything"));
    EXPECT_EQ(opened("vault/x", openReplace).name(), "vault/x");
    EXPECT_EQ(outcome([&] { master().copy("vault/x", path("y")); }), "unsupported");
    EXPECT_NE(outcome([] { master().mkdir("vault/x"); }).find("fs::Plugin::mkdir"), string::npos);
    EXPECT_FALSE(master().exists(path("vault/own")));
}

} // namespace
} // namespace base::fs
