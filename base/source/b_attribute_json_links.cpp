#include "b_attribute_json_forms.h"
#include "b_log.h"

/// Links as lists of path entries.
namespace base {

namespace {

void writeStep(const PathStep& step, const IPlugin* root, DataWriter& out,
               const JSONWriteOptions& options) {
    string repaired;
    string_view name;
    u32 index = step.index;
    if (root) {
        const string* unique = uniqueNameOf(*root, options);
        const bool written = isWritten(*root, options);
        name = written && unique ? string_view(*unique) : string_view();
        index = written ? root->id() : IPlugin::noId;
    } else {
        name = validText(step.name, options, repaired);
    }
    out.beginObject(DataLayout::flow);
    out.name("name");
    out.text(name);
    out.name("index");
    out.number(index);
    out.name("type");
    out.number(static_cast<u8>(step.kind));
    out.endObject();
}

bool logExpected(const DataReader& in, string_view what) {
    log().log(logSystem, logError, "json parser {}| Expected path entry {} at line {}!",
              in.source(), what, in.line());
    return false;
}

/// Steps over the name of the next member, if it is this one.
bool enterMember(DataReader& in, string_view name) {
    if (in.kind() != DataKind::name || in.text() != name)
        return false;
    in.skip();
    return true;
}

struct StepText {
    string_view name;
    u32 index = 0;
    PathStepKind kind = PathStepKind::plugin;
};

/// Reads a path entry, whose members have their order, and steps behind it.
bool readStep(DataReader& in, bool isFirst, StepText& step) {
    if (in.kind() != DataKind::object)
        return logExpected(in, "name");
    in.enter();
    if (!enterMember(in, "name") || in.kind() != DataKind::text ||
        in.text().find('\0') != string_view::npos)
        return logExpected(in, "name");
    step.name = in.text();
    in.skip();
    if (!enterMember(in, "index") || !in.number(step.index))
        return logExpected(in, "index");
    u8 kind = 0;
    if (!enterMember(in, "type") || !in.number(kind) ||
        kind > static_cast<u8>(PathStepKind::component))
        return logExpected(in, "type");
    step.kind = static_cast<PathStepKind>(kind);
    if (step.kind == PathStepKind::plugin && !isFirst)
        return logExpected(in, "type");
    if (in.kind() == DataKind::end) {
        in.leave();
        return true;
    }
    log().log(logSystem, logError,
              "json parser {}| Unable to read end of object at line {}! Check for extra ','.",
              in.source(), in.line());
    return false;
}

/// The object at the root of a path: by name, else by its place. None at a place without object
/// is what a link that led nowhere was written as.
IPlugin* findRoot(const DataReader& in, const StepText& step, const JSONReadOptions& options) {
    IPlugin* found = step.name.empty() ? nullptr : findNamed(in, step.name, options);
    if (!found && step.index < options.objects.size())
        found = options.objects[step.index].get();
    if (!found && !step.name.empty())
        logMissingObject(in, step.name);
    return found;
}

} // namespace

void AttribLink::writeJson(DataWriter& out, JSONWriteOptions& options) const {
    beginTyped(out, n_link, flags(), DataLayout::lines);
    out.name("@value");
    out.beginArray();
    const IPlugin* root = path_.root();
    for (const PathStep& step : path_.steps())
        writeStep(step, std::exchange(root, nullptr), out, options);
    out.endArray();
    out.endObject();
}

bool AttribLink::readJson(DataReader& in, JSONReadOptions& options) {
    path_ = {};
    const u32 start = in.place();
    bool isRead = in.kind() == DataKind::array;
    if (!isRead)
        logExpectedArray(in);
    else
        in.enter();

    AttribPath path;
    IPlugin* root = nullptr;
    while (isRead && in.kind() != DataKind::end) {
        StepText step;
        isRead = readStep(in, path.empty(), step);
        const bool isRoot = step.kind == PathStepKind::plugin;
        if (isRead && isRoot) {
            root = findRoot(in, step, options);
            step.index = shiftedId(step.index, options.firstId);
            step.name = {};
        }
        name_id name = isRoot ? nameServer().emptyName() : name_id();
        if (!step.name.empty())
            name = validName(step.name);
        path.step(step.kind, name, step.index);
    }
    if (isRead)
        path_ = std::move(path);
    if (isRead && root)
        path_.setRoot(*root);
    in.setPlace(start);
    in.skip();
    return isRead;
}

} // namespace base
