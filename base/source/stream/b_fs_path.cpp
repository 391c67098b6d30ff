#include "stream/b_fs.h"

#include <algorithm>

namespace base::fs {

namespace {

constexpr string_view separators = "/\\";
constexpr string_view fileScheme = "file://";

/// Splits off the first component of `path` and the separators behind it.
string_view takeComponent(string_view& path) {
    const std::size_t end = std::min(path.find_first_of(separators), path.size());
    const string_view component = path.substr(0, end);
    path.remove_prefix(std::min(path.find_first_not_of(separators, end), path.size()));
    return component;
}

string_view fileNameOf(string_view path) {
    return path.substr(path.find_last_of(separators) + 1);
}

/// Place of the (n+1)th dot from the end, or of the first one; npos without a dot.
std::size_t extensionDot(string_view name, u32 n) {
    std::size_t dot = name.rfind('.');
    while (n-- > 0 && dot != string_view::npos && dot != 0) {
        const std::size_t before = name.rfind('.', dot - 1);
        if (before == string_view::npos)
            break;
        dot = before;
    }
    return dot;
}

} // namespace

string folder(string_view path) {
    return string(path.substr(0, path.find_last_of(separators) + 1));
}

string fileName(string_view path) {
    return string(fileNameOf(path));
}

string stem(string_view path, u32 n) {
    const string_view name = fileNameOf(path);
    return string(name.substr(0, extensionDot(name, n)));
}

string extension(string_view path, u32 n) {
    const string_view name = fileNameOf(path);
    const std::size_t dot = extensionDot(name, n);
    return dot == string_view::npos ? string() : string(name.substr(dot + 1));
}

string normalized(string_view path) {
    if (path.empty())
        return {};
    const bool rooted = separators.find(path.front()) != string_view::npos;
    const bool trailing = separators.find(path.back()) != string_view::npos;
    path.remove_prefix(std::min(path.find_first_not_of(separators), path.size()));

    vector<string_view> kept;
    while (!path.empty()) {
        const string_view component = takeComponent(path);
        if (component == ".")
            continue;
        const bool up = component == "..";
        if (up && !kept.empty() && std::as_const(kept).back() != "..")
            kept.pop_back();
        else if (!up || !rooted) // above the root there is nothing
            kept.push_back(component);
    }

    string out = rooted ? "/" : "";
    for (const string_view component : std::as_const(kept))
        out.append(component).append("/");
    if (kept.empty())
        return rooted ? out : trailing ? "./" : ".";
    if (!trailing)
        out.pop_back();
    return out;
}

string joined(string_view folder, string_view name) {
    if (folder.empty() || isAbsolute(name))
        return string(name);
    const std::size_t last = folder.find_last_not_of(separators);
    // Of several separators at the folder's end the first one stays as it is.
    string out(last == string_view::npos ? folder.substr(0, 1) : folder.substr(0, last + 2));
    if (separators.find(out.back()) == string_view::npos)
        out.push_back('/');
    return out.append(name);
}

bool isAbsolute(string_view path) {
    const std::size_t end = path.find_first_of(separators);
    return end == 0 || path.starts_with(fileScheme) ||
           (end != string_view::npos && path[end - 1] == ':');
}

void Aliases::set(const string& name, const string& replacement) {
    const string key = name.ends_with(':') ? name.substr(0, name.size() - 1) : name;
    if (!key.empty())
        names_[key] = replacement;
}

bool Aliases::remove(const string& name) {
    return names_.erase(name.ends_with(':') ? name.substr(0, name.size() - 1) : name) != 0;
}

string Aliases::resolve(string path) const {
    constexpr int maxReplacements = 16; // aliases may name each other in a circle
    for (int i = 0; i < maxReplacements; ++i) {
        string_view rest = path;
        string_view name = takeComponent(rest);
        const std::size_t length = name.size();
        if (name.ends_with(':'))
            name.remove_suffix(1);
        const auto found = names_.find(name);
        if (found == names_.end())
            break;
        // What follows lies below the replacement, even if it looks absolute.
        path.replace(0, length, found->second);
    }
    return path;
}

Aliases& aliases() {
    static Aliases& instance = *new Aliases;
    return instance;
}

string MasterFS::resolve(const string& path) const {
    const auto withoutScheme = [](string_view text) {
        return text.starts_with(fileScheme) ? text.substr(fileScheme.size()) : text;
    };
    const string replaced = aliases().resolve(string(withoutScheme(path)));
    return normalized(withoutScheme(replaced));
}

} // namespace base::fs
