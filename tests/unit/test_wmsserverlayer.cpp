#include <gtest/gtest.h>

#include "ogc/errors.h"
#include "ogc/ogcwmsserverlayer.h"

namespace {
using Layer = VxOgcWmsServerLayer;

VxRef<Layer> named(const char* n) {
    VxRef<Layer> l(new Layer());
    l->name(n);
    return l;
}

VxRef<Layer> add(const VxRef<Layer>& parent, const char* n) {
    VxRef<Layer> c = named(n);
    parent->addChildLayer(c);
    return c;
}

void addStyle(const VxRef<Layer>& l, const char* name) {
    l->namedStyles()->push_back(VxRef<VxOgcWmsNamedStyle>(new VxOgcWmsNamedStyle(name, name, "")));
}

std::vector<std::string> styleNames(const VxRef<Layer>& l) {
    std::vector<std::string> out;
    for (size_t i = 0; i < l->namedStyles()->size(); ++i) out.push_back(l->namedStyles()->get(i)->name.str());
    return out;
}
}  // namespace

TEST(WmsServerLayer, UniqueNamesCountPerNameInVisitingOrder) {
    VxRef<Layer> root = named("");
    VxRef<Layer> a = add(root, "roads");
    VxRef<Layer> b = add(a, "roads");
    VxRef<Layer> c = add(root, "roads");
    VxRef<Layer> d = add(root, "Roads");
    VxRef<Layer> e = add(root, "");
    VxRef<Layer> f = add(e, "");
    root->generateUniqueNames();
    EXPECT_EQ(root->uniqueName(), "layer.1");
    EXPECT_EQ(a->uniqueName(), "roads");
    EXPECT_EQ(b->uniqueName(), "roads.1");
    EXPECT_EQ(c->uniqueName(), "roads.2");
    EXPECT_EQ(d->uniqueName(), "Roads");
    EXPECT_EQ(e->uniqueName(), "layer.2");
    EXPECT_EQ(f->uniqueName(), "layer.3");

    EXPECT_EQ(root->findLayerByUniqueName("roads.2").get(), c.get());
    EXPECT_EQ(root->findLayerByUniqueName("layer.3").get(), f.get());
    EXPECT_TRUE(root->findLayerByUniqueName("layer.1").isNull());  // the root itself is not searched
    EXPECT_TRUE(root->findLayerByUniqueName("nothing").isNull());
}

TEST(WmsServerLayer, StylesAndBoundsInheritTopDownAndCollectionsEndReadOnly) {
    VxRef<Layer> root = named("r");
    addStyle(root, "s0");
    root->layerBounds = VxRect(-10, -10, 10, 10);
    VxRef<Layer> child = add(root, "c");
    addStyle(child, "s1");
    VxRef<Layer> grandchild = add(child, "g");
    grandchild->layerBounds = VxRect(1, 1, 2, 2);
    addStyle(grandchild, "s2");
    root->inheritProperties();

    EXPECT_EQ(styleNames(root), (std::vector<std::string>{"s0"}));
    EXPECT_EQ(styleNames(child), (std::vector<std::string>{"s1", "s0"}));
    EXPECT_EQ(styleNames(grandchild), (std::vector<std::string>{"s2", "s1", "s0"}));
    EXPECT_EQ(child->getLayerBounds(), VxRect(-10, -10, 10, 10));
    EXPECT_EQ(grandchild->getLayerBounds(), VxRect(1, 1, 2, 2));
    EXPECT_TRUE(child->namedStyles()->isReadOnly());
    EXPECT_THROW(addStyle(child, "late"), VxXReadOnly);
}

TEST(WmsServerLayer, CrsPropagatesUpWhenEveryChildSupportsIt) {
    VxRef<Layer> root = named("r");
    root->supportedCrs = {{"EPSG", "3006"}};
    VxRef<Layer> a = add(root, "a");
    VxRef<Layer> b = add(root, "b");
    a->supportedCrs = {{"EPSG", "4326"}, {"EPSG", "3857"}};
    b->supportedCrs = {{"EPSG", "4326"}};
    root->propagateSupportedCrs();
    EXPECT_EQ(root->supportedCrs, (std::vector<Layer::CrsPair>{{"EPSG", "3006"}, {"EPSG", "4326"}}));
    // A leaf keeps its list as parsed, order and all.
    EXPECT_EQ(a->supportedCrs, (std::vector<Layer::CrsPair>{{"EPSG", "4326"}, {"EPSG", "3857"}}));

    // One child listing a pair twice does not make it supported by all.
    VxRef<Layer> r2 = named("r2");
    VxRef<Layer> x = add(r2, "x");
    VxRef<Layer> y = add(r2, "y");
    x->supportedCrs = {{"EPSG", "2056"}, {"EPSG", "2056"}};
    y->supportedCrs = {{"EPSG", "4326"}};
    r2->propagateSupportedCrs();
    EXPECT_TRUE(r2->supportedCrs.empty());
}

TEST(WmsServerLayer, CacheIdFollowsEnabledSubtreeAndReachesParent) {
    VxRef<Layer> root = named("r");
    VxRef<Layer> a = add(root, "a");
    VxRef<Layer> b = add(root, "b");
    EXPECT_EQ(root->cacheId(), "r(a(),b())");
    a->enabled(false);
    EXPECT_EQ(root->cacheId(), "r(b())");
    root->enabled(false);
    EXPECT_EQ(root->cacheId(), "");

    // A change deep in the tree is reported to the top.
    struct Top : Layer {
        int changes = 0;
        void onEnabledChanged() override { ++changes; }
    };
    VxRef<Top> top(new Top());
    VxRef<Layer> mid = named("m");
    top->addChildLayer(mid);
    VxRef<Layer> leaf = add(mid, "l");
    leaf->enabled(false);
    leaf->enabled(false);  // no change, no report
    EXPECT_EQ(top->changes, 1);
}

TEST(WmsServerLayer, CopiesAreIndependentTrees) {
    VxRef<Layer> root = named("r");
    addStyle(root, "s0");
    VxRef<Layer> a = add(root, "a");
    add(a, "a1");
    root->generateUniqueNames();
    root->style("s0");

    VxRef<Layer> deep = root->clone().cast<Layer>();
    ASSERT_TRUE(deep);
    ASSERT_EQ(deep->layers()->size(), 1u);
    VxRef<Layer> deepA = deep->getChildLayer(0);
    EXPECT_NE(deepA.get(), a.get());
    EXPECT_EQ(deepA->parent().get(), static_cast<VxLayerSet*>(deep.get()));
    EXPECT_EQ(deepA->getChildLayer(0)->name(), "a1");
    EXPECT_EQ(deep->style(), "s0");
    EXPECT_NE(deep->namedStyles().get(), root->namedStyles().get());
    deepA->enabled(false);
    EXPECT_TRUE(a->enabled());
    EXPECT_EQ(a->parent().get(), static_cast<VxLayerSet*>(root.get()));

    VxRef<Layer> shallow = a->shallowCopy();
    EXPECT_EQ(shallow->name(), "a");
    EXPECT_EQ(shallow->uniqueName(), a->uniqueName());
    EXPECT_EQ(shallow->layers()->size(), 0u);
    EXPECT_EQ(a->layers()->size(), 1u);
}

TEST(WmsServerLayer, ChildViewIsReadOnlyAndParentLinkIsWeak) {
    VxRef<Layer> root = named("r");
    VxRef<Layer> a = add(root, "a");
    EXPECT_THROW(root->layers()->add(named("x")), VxXReadOnly);
    EXPECT_EQ(root->layers()->size(), 1u);
    VxRef<Layer> orphan = a;
    root = nullptr;  // the child does not keep its parent alive
    EXPECT_TRUE(orphan->parent().isNull());
}

TEST(WmsServerLayer, StyleCollectionCannotBeClaimedTwice) {
    VxRef<Layer> l = named("l");
    auto styles = l->namedStyles();
    EXPECT_TRUE(styles->isOwned());
    EXPECT_FALSE(styles->takeOwnership());
}

TEST(WmsServerLayer, BoundsOfDataSetsAreProjectedAndJoinedAcrossTheAntimeridian) {
    VxRef<Layer> l = named("l");
    EXPECT_EQ(l->getBoundsOfDataSets(VxCrs::fromUrn("EPSG:3857")), VxRect());  // unknown stays unknown
    l->layerBounds = VxRect(0, 0, 10, 10);
    const VxRect m = l->getBoundsOfDataSets(VxCrs::fromUrn("EPSG:3857"));
    EXPECT_NEAR(m.maxx, 1113194.91, 0.01);
    EXPECT_NEAR(m.maxy, 1118889.97, 0.01);
    // A box past 180 falls into two pieces in a geographic system; the result joins them.
    l->layerBounds = VxRect(170, -10, 190, 10);
    EXPECT_EQ(l->getBoundsOfDataSets(VxCrs::wgs84LongLat()), VxRect(-180, -10, 180, 10));
}
