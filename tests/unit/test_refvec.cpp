#include <gtest/gtest.h>

#include <algorithm>
#include <functional>
#include <thread>
#include <vector>

#include "vx/refvec.h"

namespace {
// An element that counts its live instances so that leaks and early releases show.
class Item : public VxEngineObject {
public:
    static int live;
    explicit Item(int v = 0) : value(v) { ++live; }
    Item(const Item& o) : VxEngineObject(o), value(o.value) { ++live; }
    ~Item() override { --live; }
    VxRef<VxEngineObject> cloneWithMap(VxOperatorMap*) const override { return new Item(*this); }
    void toXml(VxXmlSerializer*, TiXmlElement* parent, const VxString&, bool isPublic) const override {
        auto* e = new TiXmlElement("Item");
        e->SetAttribute("Value", value);
        if (isPublic) e->SetAttribute("Public", "true");
        if (parent) parent->LinkEndChild(e);
        else delete e;
    }
    int value;
};
int Item::live = 0;

// Not an engine object: only counted, with a clone of its own.
class Plain : public VxRefCnt {
public:
    VxRef<Plain> clone() const { return new Plain; }
};

using Items = VxRefVec<Item>;

struct RefVecTest : ::testing::Test {
    void SetUp() override { Item::live = 0; }
    void TearDown() override { EXPECT_EQ(Item::live, 0) << "elements leaked"; }
    static std::vector<Item*> fill(Items& v, int n) {
        std::vector<Item*> out;
        for (int i = 0; i < n; ++i) {
            out.push_back(new Item(i));
            v.add(out.back());
        }
        return out;
    }
};
}  // namespace

TEST_F(RefVecTest, AppendGrowsByHalfAndMakeRoomIsExact) {
    VxRef<Items> v(new Items);
    EXPECT_EQ(v->capacity(), 0u);
    EXPECT_EQ(v->memoryPressure(), 880u);
    std::vector<size_t> caps;
    for (int i = 0; i < 20; ++i) {
        v->add(new Item(i));
        if (caps.empty() || caps.back() != v->capacity()) caps.push_back(v->capacity());
    }
    EXPECT_EQ(caps, (std::vector<size_t>{1, 2, 3, 4, 6, 9, 13, 19, 28}));
    EXPECT_EQ(v->memoryPressure(), 44u * 28u);
    for (int i = 0; i < 20; ++i) EXPECT_EQ(v->get(i)->value, i);

    // Shrinking keeps the slots; making room for less than the capacity does nothing.
    v->resize(5);
    EXPECT_EQ(Item::live, 5);
    EXPECT_EQ(v->capacity(), 28u);
    v->reserve(10);
    EXPECT_EQ(v->capacity(), 28u);
    v->reserve(40);
    EXPECT_EQ(v->capacity(), 40u);
    v->clear();
    EXPECT_EQ(Item::live, 0);
    EXPECT_TRUE(v->empty());
    EXPECT_EQ(v->capacity(), 40u);

    VxRef<Items> one(new Items);
    one->add(new Item);
    EXPECT_EQ(one->memoryPressure(), 44u);
}

TEST_F(RefVecTest, ResizeGrowsByCapacityPlusCountWithNulls) {
    Items v;
    auto items = fill(v, 2);
    ASSERT_EQ(v.capacity(), 2u);
    v.resize(3);
    EXPECT_EQ(v.size(), 3u);
    EXPECT_EQ(v.capacity(), 5u);
    EXPECT_EQ(v.get(0).get(), items[0]);
    EXPECT_EQ(v.get(1).get(), items[1]);
    EXPECT_TRUE(v.back().isNull());
    // A null element is kept and found like any other.
    size_t i = 99;
    EXPECT_TRUE(v.indexOf(nullptr, i));
    EXPECT_EQ(i, 2u);

    Items counted(3);
    EXPECT_EQ(counted.size(), 3u);
    EXPECT_TRUE(counted.front().isNull());
}

TEST_F(RefVecTest, ReadOnlyRejectsEveryChangeButReadsAndClones) {
    VxRef<Items> v(new Items);
    auto items = fill(*v, 3);
    VxRef<Item> outsider(new Item(7));
    v->markReadOnly();
    ASSERT_TRUE(v->isReadOnly());

    try {
        v->add(new Item(9));
        FAIL() << "add on a read-only collection";
    } catch (const VxXReadOnly& e) {
        EXPECT_EQ(e.asString(), "The Collection is read-only.");
    }
    std::vector<std::function<void()>> changes = {
        [&] { v->push_back(outsider); },      [&] { v->insert(0, outsider); },
        [&] { v->set(0, outsider); },         [&] { v->removeAt(0); },
        [&] { v->erase(v->begin()); },        [&] { v->erase(v->begin(), v->end()); },
        [&] { v->pop_back(); },               [&] { v->clear(); },
        [&] { v->reverse(); },                [&] { v->sort(); },
        [&] { v->resize(1); },                [&] { v->reserve(100); },
        [&] { v->addRange(*v); },             [&] { v->assign(*v); },
        [&] { v->insertRange(1, *v); },       [&] { v->remove(items[1]); },
    };
    for (size_t k = 0; k < changes.size(); ++k) EXPECT_THROW(changes[k](), VxXReadOnly) << k;
    // Nothing changed.
    ASSERT_EQ(v->size(), 3u);
    EXPECT_EQ(v->capacity(), 3u);
    for (int k = 0; k < 3; ++k) EXPECT_EQ(v->get(k).get(), items[k]);

    // Removing something that is not there is not a change.
    EXPECT_FALSE(v->remove(outsider));
    EXPECT_TRUE(v->contains(items[2]));

    VxRef<Items> copy = v->cloneVec();
    ASSERT_TRUE(copy);
    EXPECT_FALSE(copy->isReadOnly());
    EXPECT_EQ(copy->size(), 3u);
    copy->add(outsider);
    EXPECT_EQ(copy->size(), 4u);
}

TEST_F(RefVecTest, ElementsAreComparedByIdentity) {
    VxRef<Items> a(new Items), b(new Items);
    EXPECT_TRUE(a->equals(b));
    EXPECT_FALSE(a->equals(nullptr));
    EXPECT_FALSE(a->equals(VxRef<Items>()));

    auto items = fill(*a, 3);
    VxRef<Item> twin(new Item(*items[1]));  // equal contents, another object
    EXPECT_FALSE(a->contains(twin));
    size_t i = 0;
    EXPECT_FALSE(a->indexOf(twin, i));
    EXPECT_EQ(i, 3u);
    EXPECT_TRUE(a->indexOf(items[1], i));
    EXPECT_EQ(i, 1u);

    VxRef<Items> shallow = a->shallowCopy();
    EXPECT_TRUE(a->equals(shallow));
    EXPECT_TRUE(*a == *shallow);
    shallow->set(1, twin);
    EXPECT_FALSE(a->equals(shallow));
    EXPECT_TRUE(*a != *shallow);

    // A deep copy holds new objects with the same contents.
    VxRef<Items> deep = a->clone().cast<Items>();
    ASSERT_TRUE(deep);
    ASSERT_EQ(deep->size(), 3u);
    EXPECT_FALSE(a->equals(deep));
    for (size_t k = 0; k < 3; ++k) {
        EXPECT_NE(deep->get(k).get(), items[k]);
        EXPECT_EQ(deep->get(k)->value, items[k]->value);
    }
    EXPECT_EQ(Item::live, 7);
}

TEST_F(RefVecTest, OwnershipIsASingleClaim) {
    VxRef<Items> v(new Items);
    EXPECT_FALSE(v->isOwned());
    v->releaseOwnership();  // not owned: nothing happens
    EXPECT_FALSE(v->isOwned());
    EXPECT_TRUE(v->takeOwnership());
    EXPECT_FALSE(v->takeOwnership());
    EXPECT_TRUE(v->isOwned());
    v->add(new Item);  // ownership restricts nothing
    v->releaseOwnership();
    EXPECT_FALSE(v->isOwned());
    EXPECT_TRUE(v->takeOwnership());
    v->takeOwnershipArgument(42);
    EXPECT_EQ(v->ownershipArgument(), 42);

    // Copies are never owned.
    auto shallow = v->shallowCopy();
    auto deep = v->cloneVec();
    EXPECT_FALSE(shallow->isOwned());
    EXPECT_FALSE(deep->isOwned());

    // Concurrent claims: exactly one wins.
    VxRef<Items> contested(new Items);
    std::atomic<int> winners{0};
    std::vector<std::thread> threads;
    for (int t = 0; t < 8; ++t)
        threads.emplace_back([&] { if (contested->takeOwnership()) ++winners; });
    for (auto& t : threads) t.join();
    EXPECT_EQ(winners.load(), 1);
}

TEST_F(RefVecTest, EditingKeepsOrderAndCounts) {
    Items v;
    v.pop_back();  // empty: nothing
    EXPECT_TRUE(v.empty());

    auto items = fill(v, 4);  // 0 1 2 3
    VxRef<Item> x(new Item(10)), y(new Item(11));
    v.insert(4, x);           // 0 1 2 3 x
    v.insert(0, y);           // y 0 1 2 3 x
    EXPECT_EQ(x->refCount(), 2);

    Items other;
    other.add(x);
    other.add(y);
    v.insertRange(2, other);  // y 0 x y 1 2 3 x
    std::vector<Item*> want = {y.get(), items[0], x.get(), y.get(), items[1], items[2], items[3], x.get()};
    ASSERT_EQ(v.size(), want.size());
    EXPECT_EQ(v.capacity(), 8u);  // exactly what was needed
    for (size_t k = 0; k < want.size(); ++k) EXPECT_EQ(v[k].get(), want[k]) << k;
    EXPECT_EQ(x->refCount(), 4);

    EXPECT_TRUE(v.remove(x));  // the first one only
    EXPECT_EQ(v[2].get(), y.get());
    EXPECT_EQ(v.back().get(), x.get());
    v.erase(v.begin() + 1, v.begin() + 3);  // y y 1 2 3 x -> y 1 2 3 x
    ASSERT_EQ(v.size(), 5u);
    EXPECT_EQ(v[1].get(), items[1]);
    EXPECT_EQ(Item::live, 5);  // item 0 is gone
    v.removeAt(0);
    v.pop();
    EXPECT_EQ(x->refCount(), 2);  // x and other
    EXPECT_EQ(y->refCount(), 2);  // y and other

    v.reverse();  // 3 2 1
    EXPECT_EQ(v.front().get(), items[3]);
    v.set(0, v[2]);  // 1 2 1: assigning an element to itself stays safe
    EXPECT_EQ(v[0].get(), items[1]);
    EXPECT_EQ(Item::live, 4);  // item 3 released

    v.addRange(v);  // 1 2 1 1 2 1
    ASSERT_EQ(v.size(), 6u);
    EXPECT_EQ(v[5].get(), items[1]);
    v.assign(v);  // a collection assigned to itself keeps its elements
    EXPECT_EQ(v.size(), 6u);
    v.insertRange(1, v);
    EXPECT_EQ(v.size(), 12u);
    EXPECT_EQ(v[1].get(), items[1]);
    EXPECT_EQ(v[6].get(), items[1]);
    EXPECT_EQ(v[7].get(), items[2]);
    v.assign(other);
    EXPECT_EQ(v.size(), 2u);
    EXPECT_EQ(Item::live, 2);
}

TEST_F(RefVecTest, SortOrdersByAddress) {
    Items v;
    auto items = fill(v, 40);  // above the insertion-sort threshold
    v.add(nullptr);
    v.sort();
    std::sort(items.begin(), items.end(), std::less<Item*>());
    EXPECT_TRUE(v.front().isNull());
    for (size_t k = 0; k < items.size(); ++k) EXPECT_EQ(v[k + 1].get(), items[k]);
    EXPECT_EQ(Item::live, 40);
}

TEST_F(RefVecTest, DestructionReleasesElements) {
    VxRef<Item> kept(new Item);
    {
        VxRef<Items> v(new Items);
        fill(*v, 5);
        v->add(kept);
        EXPECT_EQ(Item::live, 6);
        EXPECT_EQ(kept->refCount(), 2);
    }
    EXPECT_EQ(Item::live, 1);
    EXPECT_EQ(kept->refCount(), 1);
}

TEST_F(RefVecTest, RuntimeClassIsPerInstantiation) {
    using Plains = VxRefVec<Plain>;
    EXPECT_NE(Items::classId(), Plains::classId());
    EXPECT_EQ(Items::classId(), Items::classId());
    VxRef<Items> v(new Items);
    EXPECT_EQ(v->myClassId_(), Items::classId());
    EXPECT_TRUE(v->isKindOf(VxEngineObject::runtimeClass()));
    EXPECT_EQ(Items::runtimeClass()->moduleCode, 11);
    EXPECT_EQ(v->myRuntimeClassName(), "VxRefVec<(anonymous namespace)::Item>");

    // Elements that are merely counted still clone.
    Plains p;
    p.add(new Plain);
    p.add(nullptr);
    VxRef<Plains> c = p.cloneVec();
    ASSERT_EQ(c->size(), 2u);
    EXPECT_TRUE(c->get(0));
    EXPECT_NE(c->get(0).get(), p.get(0).get());
    EXPECT_TRUE(c->get(1).isNull());
}

TEST_F(RefVecTest, WritesItselfAsAPropertyElement) {
    Items v;
    fill(v, 2);
    TiXmlElement layer("OgcWmsServerLayer");
    v.toXml(nullptr, &layer, "NamedStyles", "VxRefVec", true);
    TiXmlElement* prop = layer.FirstChildElement();
    ASSERT_TRUE(prop);
    EXPECT_EQ(prop->ValueStr(), "OgcWmsServerLayer.NamedStyles");
    TiXmlElement* cls = prop->FirstChildElement();
    ASSERT_TRUE(cls);
    EXPECT_EQ(cls->ValueStr(), "VxRefVec");
    ASSERT_TRUE(cls->Attribute("Public"));
    EXPECT_STREQ(cls->Attribute("Public"), "true");
    int n = 0;
    for (TiXmlElement* e = cls->FirstChildElement("Item"); e; e = e->NextSiblingElement("Item")) {
        int value = -1;
        e->QueryIntAttribute("Value", &value);
        EXPECT_EQ(value, n++);
        EXPECT_EQ(e->Attribute("Public"), nullptr);  // elements write themselves as not public
    }
    EXPECT_EQ(n, 2);

    TiXmlElement quiet("L");
    v.toXml(nullptr, &quiet, "P", "VxRefVec", false);
    EXPECT_EQ(quiet.FirstChildElement()->FirstChildElement()->Attribute("Public"), nullptr);
}
