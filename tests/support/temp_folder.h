#pragma once

#include <cstdlib>
#include <filesystem>
#include <optional>
#include <stdexcept>
#include <string>

namespace test_support {

/// A new folder, removed at the end with what lies in it.
class TempFolder {
public:
    TempFolder() {
        if (!::mkdtemp(path_.data()))
            throw std::runtime_error("no temporary folder");
    }
    ~TempFolder() { std::filesystem::remove_all(path_); }
    TempFolder(const TempFolder&) = delete;
    TempFolder& operator=(const TempFolder&) = delete;

    /// Without a separator at its end.
    const std::string& path() const { return path_; }
    std::string operator/(const std::string& name) const { return path_ + "/" + name; }

private:
    std::string path_ = (std::filesystem::temp_directory_path() / "scene_test_XXXXXX").string();
};

/// Moves the place of temporary files while it lives.
class TmpDirGuard {
public:
    explicit TmpDirGuard(const std::string& place) {
        if (const char* before = std::getenv("TMPDIR"))
            before_ = before;
        setenv("TMPDIR", place.c_str(), 1);
    }
    ~TmpDirGuard() { before_ ? setenv("TMPDIR", before_->c_str(), 1) : unsetenv("TMPDIR"); }
    TmpDirGuard(const TmpDirGuard&) = delete;
    TmpDirGuard& operator=(const TmpDirGuard&) = delete;

private:
    std::optional<std::string> before_;
};

} // namespace test_support
