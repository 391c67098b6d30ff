#include "b_attribute_path.h"

#include "b_factory.h"
#include "log_capture.h"

#include <gtest/gtest.h>
#include <memory>

namespace base {
namespace {

using namespace test_support;

name_id named(string_view text) {
    return nameServer().id(text);
}

/// Recomputes its untracked `outputs[0]` whenever somebody is about to read it.
class Evaluator : public IPlugin {
public:
    using IPlugin::IPlugin;

    void pathChanged(const AttribPath& path, u32 mode) override {
        modes.push_back(mode);
        if (mode != 0)
            return;
        if (readWhileAsked)
            findAttribute<i32>(named("back"));
        auto* output = new TypedAttribute<i32>(++evaluations);
        output->setFlags(attribUntracked | attribTransient);
        arrayAttribute(named("outputs")).setItem(path.steps()[2].index, output);
    }
    bool isPathAnimated(const AttribPath&) const override { return animatedPaths; }

    vector<u32> modes;
    i32 evaluations = 0;
    bool readWhileAsked = false;
    bool animatedPaths = false;
};

class AttribPathTest : public testing::Test {
protected:
    ref<IPlugin> make() { return factory.create(named("thing")); }
    ref<Evaluator> makeEvaluator() {
        const auto made = makeRef<Evaluator>(nullptr, &factory, IPlugin::noId);
        factory.addPlugin(made);
        return made;
    }
    /// Puts a link to `path` under `name` of `map`.
    static AttribLink& link(AttribMap& map, string_view name, AttribPath path) {
        auto* made = new AttribLink(std::move(path));
        map.attribute(named(name), made);
        return *made;
    }
    string brokenText(string_view name, string_view value) const {
        return format("3 map attribute| Detected invalid link attribute! Cannot resolve '{}' with "
                      "value '{}'!\n",
                      name, value);
    }

    PluginFactory factory;
    ref<IPlugin> a = make(), b = make();
    LogCapture log;
};

TEST_F(AttribPathTest, ResolvesEachKindOfStep) {
    AttribMap& inner = a->mapAttribute(named("m"), {});
    inner.arrayAttribute(named("list")).append(nullptr);
    auto* element = new TypedAttribute<vec3f>;
    inner.arrayAttribute(named("list")).append(element);

    EXPECT_EQ(AttribPath().resolve(), nullptr);
    EXPECT_EQ(AttribPath(*a).resolve(), a.get());
    AttribPath path(*a, named("m"));
    EXPECT_EQ(path.resolve(), &inner);
    path.attribute(named("list"));
    EXPECT_EQ(AttribPath(path).element(0).resolve(), nullptr);
    EXPECT_EQ(AttribPath(path).element(1).resolve(), element);
    EXPECT_EQ(AttribPath(path).element(2).resolve(), nullptr);
    EXPECT_EQ(AttribPath(path).element(1).component(2).resolve(), element);
    EXPECT_EQ(AttribPath(path).element(1).attribute(named("x")).resolve(), nullptr);
    EXPECT_EQ(AttribPath(*a, named("missing")).attribute(named("x")).resolve(), nullptr);
    EXPECT_TRUE(log.entries().empty());
}

TEST_F(AttribPathTest, TextNamesEveryStep) {
    const AttribPath path =
        AttribPath(*b, named("plain")).attribute(named("a.b[c]{d}\\")).element(3);
    EXPECT_EQ(path.toString(), "Plugin[1].plain.a\\.b\\[c\\]\\{d\\}\\\\[3]");
    EXPECT_EQ(AttribPath(*a, named("v")).component(0).toString(), "Plugin[0].v{0}");
    EXPECT_EQ(AttribPath().toString(), "");
}

TEST_F(AttribPathTest, EqualityIsByStepsAndRoot) {
    const AttribPath x(*a, named("x"));
    EXPECT_EQ(x, AttribPath(*a, named("x")));
    EXPECT_FALSE(x == AttribPath(*a, named("y")));
    EXPECT_FALSE(x == AttribPath(*b, named("x")));
    EXPECT_FALSE(x == AttribPath(*a));
    EXPECT_FALSE(AttribPath(x).element(1) == AttribPath(x).element(2));
    EXPECT_FALSE(AttribPath(x).element(1) == AttribPath(x).component(1));
    AttribLink one(x), two;
    EXPECT_FALSE(two.assign(one, assignMerge));
    EXPECT_TRUE(two.assign(one, assignCopy));
    EXPECT_EQ(one.compare(two.data()), 0);
}

TEST_F(AttribPathTest, SurvivesItsTargetAndNotItsRoot) {
    a->attribute<i32>(named("x")) = 1;
    AttribPath path(*a, named("x"));
    EXPECT_EQ(path.resolve(), a->findAttribute(named("x")));
    a->removeAttribute(named("x"));
    EXPECT_EQ(path.resolve(), nullptr);
    a->attribute<i32>(named("x")) = 2;
    EXPECT_EQ(path.resolve(), a->findAttribute(named("x")));

    b->attribute<i32>(named("x")) = 3;
    path.setRoot(*b);
    EXPECT_EQ(path.resolve(), b->findAttribute(named("x")));
    factory.remove(b->id(), true);
    b.reset();
    EXPECT_EQ(path.root(), nullptr);
    EXPECT_EQ(path.resolve(), nullptr);
    EXPECT_EQ(path.toString(), "Plugin[1].x");
}

TEST_F(AttribPathTest, WeakLinksLeaveInAnyOrder) {
    a->attribute<i32>(named("x")) = 1;
    vector<AttribPath> paths(5, AttribPath(*a, named("x")));
    for (const AttribPath& path : std::as_const(paths))
        EXPECT_TRUE(path.resolve());
    paths.erase(paths.cbegin() + 2);
    paths[0] = AttribPath(*b);
    paths.pop_back();
    EXPECT_TRUE(a->findAttribute(named("x"))->hasWeakLinks());
    a->removeAttribute(named("x"));
    EXPECT_EQ(paths[1].resolve(), nullptr);
    paths.clear();
    EXPECT_FALSE(a->hasWeakLinks());
}

TEST_F(AttribPathTest, LinksAreFollowedToTheEnd) {
    a->attribute<i32>(named("x")) = 5;
    link(*a, "first", AttribPath(*a, named("x")));
    AttribLink& second = link(*b, "second", AttribPath(*a, named("first")));
    EXPECT_EQ(*b->findAttribute<i32>(named("second")), 5);
    EXPECT_EQ(second.path().resolve(), a->findAttribute(named("x")));
    b->attribute<i32>(named("second")) = 6;
    EXPECT_EQ(*a->findAttribute<i32>(named("x")), 6);
    // A link in the middle that is pointed elsewhere is noticed.
    a->attribute<i32>(named("y")) = 7;
    link(*a, "first", AttribPath(*a, named("y")));
    EXPECT_EQ(*b->findAttribute<i32>(named("second")), 7);
    // So is one that a path leads through.
    a->mapAttribute(named("m"), {}).attribute<i32>(named("z")) = 1;
    b->mapAttribute(named("m"), {}).attribute<i32>(named("z")) = 2;
    link(*a, "map", AttribPath(*a, named("m")));
    link(*b, "through", AttribPath(*a, named("map")).attribute(named("z")));
    EXPECT_EQ(*b->findAttribute<i32>(named("through")), 1);
    link(*a, "map", AttribPath(*b, named("m")));
    EXPECT_EQ(*b->findAttribute<i32>(named("through")), 2);
}

TEST_F(AttribPathTest, BrokenLinksAreReportedOnceAnAccess) {
    a->attribute<i32>(named("x")) = 5;
    AttribLink& inner = link(*a, "inner", AttribPath(*a, named("x")));
    link(*a, "outer", AttribPath(*a, named("inner")));
    EXPECT_TRUE(a->findAttribute(named("outer")));
    a->removeAttribute(named("x"));
    EXPECT_EQ(a->findAttribute(named("outer")), nullptr);
    EXPECT_EQ(a->findAttribute<i32>(named("outer")), nullptr);
    link(*a, "empty", {});
    EXPECT_EQ(a->findAttribute(named("empty")), nullptr);
    EXPECT_EQ(linesOf(log), brokenText("outer", "Plugin[0].x") +
                                brokenText("outer", "Plugin[0].x") + brokenText("empty", ""));
    log.take();
    inner.setFlags(attribSilentLink);
    EXPECT_EQ(a->findAttribute(named("outer")), nullptr);
    EXPECT_TRUE(a->findAttribute(named("outer"), false)->asLink());
    EXPECT_TRUE(log.entries().empty());
}

TEST_F(AttribPathTest, ChainsEndAfter64Links) {
    a->attribute<i32>(named("chain/0")) = 1;
    for (int i = 1; i <= 65; ++i)
        link(*a, format("chain/{}", i), AttribPath(*a, named(format("chain/{}", i - 1))));
    EXPECT_TRUE(a->findAttribute(named("chain/64")));
    EXPECT_EQ(a->findAttribute(named("chain/65")), nullptr);
    EXPECT_EQ(log.take().size(), 1u);
    // In a circle, and in one that passes through the middle of paths
    link(*a, "circle", AttribPath(*b, named("circle")));
    link(*b, "circle", AttribPath(*a, named("circle")));
    EXPECT_EQ(a->findAttribute(named("circle")), nullptr);
    link(*a, "knot", AttribPath(*a, named("knot")).attribute(named("knot")).element(1));
    EXPECT_EQ(a->findAttribute(named("knot")), nullptr);
    EXPECT_EQ(log.entries().size(), 2u);
    EXPECT_FALSE(a->isAnimated());
}

TEST_F(AttribPathTest, UntrackedTargetsAreEvaluatedOnEachUse) {
    const ref<Evaluator> layer = makeEvaluator();
    const AttribPath output = AttribPath(*layer, named("outputs")).element(0);
    link(*a, "x", output);
    EXPECT_EQ(*a->findAttribute<i32>(named("x")), 1);
    EXPECT_EQ(*a->findAttribute<i32>(named("x")), 2);
    // The output is replaced without the path's knowledge.
    EXPECT_EQ(output.resolve(), layer->findArray(named("outputs"))->item(0));
    EXPECT_FALSE(output.resolve()->hasWeakLinks());
    layer->findArray(named("outputs"))->setItem(0, nullptr);
    EXPECT_EQ(output.resolve(), nullptr);
    EXPECT_EQ(layer->evaluations, 2);
    EXPECT_TRUE(log.entries().empty());
}

TEST_F(AttribPathTest, AnEvaluationThatNeedsItselfIsNotAskedAgain) {
    const ref<Evaluator> layer = makeEvaluator();
    layer->readWhileAsked = true;
    link(*layer, "back", AttribPath(*layer, named("outputs")).element(1));
    link(*a, "x", AttribPath(*layer, named("outputs")).element(0));
    EXPECT_EQ(*a->findAttribute<i32>(named("x")), 1);
    EXPECT_EQ(layer->modes, vector<u32>{0});
    EXPECT_EQ(linesOf(log), brokenText("back", "Plugin[2].outputs[1]"));
}

TEST_F(AttribPathTest, ChangesAreToldByMode) {
    const ref<Evaluator> source = makeEvaluator(), holder = makeEvaluator();
    source->attribute<i32>(named("x")) = 1;
    link(*holder, "x", AttribPath(*source, named("x")));
    EXPECT_TRUE(holder->findAttributeMutable(named("x")));
    EXPECT_EQ(source->modes, vector<u32>{1});
    EXPECT_EQ(holder->modes, vector<u32>{2});
    EXPECT_TRUE(holder->findAttributeMutable(named("x"), 0));
    EXPECT_TRUE(holder->findAttributeMutable(named("x"), 3, false)->asLink());
    EXPECT_EQ(source->modes, vector<u32>{1});
    EXPECT_EQ(holder->modes, (vector<u32>{2, 2}));
    EXPECT_FALSE(holder->findAttributeMutable(named("nothing")));
    EXPECT_EQ(holder->modes.size(), 2u);
}

TEST_F(AttribPathTest, LinksAreAnimatedWithTheirTargetOrByTheirRoot) {
    const ref<Evaluator> layer = makeEvaluator();
    layer->attribute<i32>(named("x")) = 1;
    link(a->mapAttribute(named("m"), {}), "x", AttribPath(*layer, named("x")));
    EXPECT_FALSE(a->isAnimated());
    layer->findAttribute(named("x"))->setFlags(attribAnimated);
    EXPECT_TRUE(a->isAnimated());
    layer->findAttribute(named("x"))->setFlags(0);
    layer->animatedPaths = true;
    EXPECT_TRUE(a->isAnimated());

    // Twenty links that lead back to where they are held
    for (int i = 0; i < 20; ++i)
        link(*b, format("self/{}", i), AttribPath(*b));
    EXPECT_FALSE(b->isAnimated());
}

} // namespace
} // namespace base
