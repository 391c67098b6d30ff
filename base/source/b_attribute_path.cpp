#include "b_attribute_path.h"

#include "b_attribute_links.h"
#include "b_factory.h"

#include <mutex>
#include <shared_mutex>

namespace base {

namespace {

/// A plugin that is being asked on this thread to bring a link's target up to date.
struct Question {
    const IPlugin* root;
    const Question* outer;
    u32 depth;
};

thread_local const Question* currentQuestion = nullptr;

/// Asks the plugin at the root of `path` to evaluate what the path names. False if there is none,
/// or if it is being asked already: an evaluation that needs its own result has none.
bool askRoot(const AttribPath& path) {
    IPlugin* root = path.root();
    const u32 depth = currentQuestion ? currentQuestion->depth + 1 : 1;
    if (!root || depth > maxLinkHops)
        return false;
    for (const Question* q = currentQuestion; q; q = q->outer)
        if (q->root == root)
            return false;

    struct Scope {
        Question question;
        explicit Scope(Question asked) : question(asked) { currentQuestion = &question; }
        ~Scope() { currentQuestion = question.outer; }
    };
    const Scope scope({root, currentQuestion, depth});
    root->pathChanged(path, 0);
    return true;
}

void appendEscaped(string& out, string_view name) {
    for (const char c : name) {
        if (string_view(".[]{}\\").find(c) != string_view::npos)
            out += '\\';
        out += c;
    }
}

void appendIndex(string& out, char open, u32 index, char close) {
    out += open;
    out += std::to_string(index);
    out += close;
}

} // namespace

void AttribWeakLink::set(Attribute* target) noexcept {
    if (target == target_)
        return;
    if (target_) {
        const std::lock_guard guard(target_->weakLock_);
        (previous_ ? previous_->next_ : target_->weakHead_) = next_;
        if (next_)
            next_->previous_ = previous_;
        previous_ = next_ = nullptr;
    }
    target_ = target;
    if (target) {
        const std::lock_guard guard(target->weakLock_);
        next_ = target->weakHead_;
        if (next_)
            next_->previous_ = this;
        target->weakHead_ = this;
    }
}

AttribPath::AttribPath(IPlugin& root) {
    setRoot(root);
}

AttribPath::AttribPath(IPlugin& root, name_id name) : AttribPath(root) {
    attribute(name);
}

AttribPath& AttribPath::attribute(name_id name) {
    return step(PathStepKind::attribute, name, 0);
}

AttribPath& AttribPath::element(u32 index) {
    return step(PathStepKind::element, {}, index);
}

AttribPath& AttribPath::component(u32 index) {
    return step(PathStepKind::component, {}, index);
}

AttribPath& AttribPath::step(PathStepKind kind, name_id name, u32 index) {
    PathStep& made = steps_.emplace_back();
    made.name = name;
    made.index = index;
    made.kind = kind;
    return *this;
}

IPlugin* AttribPath::root() const noexcept {
    const vector<PathStep>& steps = steps_;
    if (steps.empty() || steps[0].kind != PathStepKind::plugin)
        return nullptr;
    return static_cast<IPlugin*>(steps[0].target.target());
}

void AttribPath::setRoot(IPlugin& root) {
    if (steps_.empty())
        step(PathStepKind::plugin, nameServer().emptyName(), 0);
    for (PathStep& step : steps_)
        step.target.set(nullptr);
    steps_[0].target.set(&root);
    steps_[0].index = root.id();
}

Attribute* AttribPath::resolve() const {
    u32 hopsLeft = maxLinkHops;
    return followLinks(resolveStep(hopsLeft), hopsLeft);
}

/// What the resolving step names, without following a link found there: the link may be pointed
/// elsewhere later, so only the link itself is stored. For the same reason a target that was
/// reached through a link or a parent is not stored.
Attribute* AttribPath::resolveStep(u32& hopsLeft) const {
    if (steps_.empty())
        return nullptr;
    const std::size_t end =
        steps_.size() -
        (steps_.back().kind == PathStepKind::component && steps_.size() > 1 ? 2 : 1);
    std::size_t at = end;
    while (at > 0 && !steps_[at].target.target())
        --at;

    Attribute* current = steps_[at].target.target();
    bool stable = true;
    while (current && at < end) {
        if (current->asLink()) {
            current = followLinks(current, hopsLeft);
            stable = false;
        }
        PathStep& step = steps_[++at];
        Attribute* next = nullptr;
        if (current && step.kind == PathStepKind::attribute && current->asMap()) {
            const IPlugin* plugin = root();
            std::shared_lock<ReadWriteSpinLock> guard;
            if (plugin)
                guard = std::shared_lock(plugin->pathLock_);
            next = current->asMap()->findOwn(step.name);
            if (!next) {
                next = current->asMap()->findInherited(step.name);
                stable = false;
            }
        } else if (current && step.kind == PathStepKind::element && current->asArray()) {
            next = current->asArray()->item(step.index);
        }
        const bool stays = stable && next && !next->hasFlag(attribUntracked);
        step.target.set(stays ? next : nullptr);
        current = next;
    }
    return current;
}

string AttribPath::toString() const {
    string text;
    for (const PathStep& step : std::as_const(steps_)) {
        switch (step.kind) {
        case PathStepKind::plugin:
            text += "Plugin";
            appendIndex(text, '[', root() ? root()->id() : step.index, ']');
            break;
        case PathStepKind::attribute:
            text += '.';
            appendEscaped(text, step.name.view());
            break;
        case PathStepKind::element:
            appendIndex(text, '[', step.index, ']');
            break;
        case PathStepKind::component:
            appendIndex(text, '{', step.index, '}');
            break;
        }
    }
    return text;
}

bool operator==(const AttribPath& a, const AttribPath& b) {
    const auto sameStep = [](const PathStep& x, const PathStep& y) {
        return x.kind == y.kind && x.name == y.name &&
               (x.index == y.index || x.kind == PathStepKind::plugin);
    };
    const vector<PathStep>&x = a.steps_, &y = b.steps_;
    if (a.root() != b.root() || !std::equal(x.begin(), x.end(), y.begin(), y.end(), sameStep))
        return false;
    return a.root() || x.empty() || x[0].index == y[0].index;
}

Attribute* linkTarget(const AttribLink& link, u32& hopsLeft) {
    if (hopsLeft == 0)
        return nullptr;
    --hopsLeft;
    Attribute* target = link.path().resolveStep(hopsLeft);
    if ((!target || target->hasFlag(attribUntracked)) && askRoot(link.path()))
        target = link.path().resolveStep(hopsLeft);
    return target;
}

Attribute* followLinks(Attribute* a, u32& hopsLeft, const AttribLink** broken) {
    const AttribLink* link = nullptr;
    while (a && (link = a->asLink()))
        a = linkTarget(*link, hopsLeft);
    if (!a && broken)
        *broken = link;
    return a;
}

} // namespace base
