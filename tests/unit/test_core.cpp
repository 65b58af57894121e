#include <gtest/gtest.h>

#include <atomic>
#include <clocale>
#include <cstdint>
#include <limits>
#include <locale>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include "vx/classmetadata.h"
#include "vx/engineobject.h"
#include "vx/log.h"
#include "vx/refcnt.h"
#include "vx/runtime.h"
#include "vx/string.h"
#include "vx/stringutils.h"
#include "vx/xmlparsercontext.h"

namespace {
struct LogCapture {
    std::vector<std::pair<int, std::string>> lines;
    int saved = VxLog::logLevel();
    LogCapture() {
        VxLog::setSink([this](int level, const char*, const std::string& t) { lines.emplace_back(level, t); });
    }
    ~LogCapture() {
        VxLog::setSink(nullptr);
        VxLog::logLevel(saved);
    }
};

// A decimal comma and a thousands dot, to prove that number texts ignore the locale.
struct CommaPunct : std::numpunct<char> {
    char do_decimal_point() const override { return ','; }
    char do_thousands_sep() const override { return '.'; }
    std::string do_grouping() const override { return "\3"; }
};
struct CommaLocale {
    std::locale saved;
    CommaLocale() : saved(std::locale::global(std::locale(std::locale::classic(), new CommaPunct))) {}
    ~CommaLocale() { std::locale::global(saved); }
};
}  // namespace

TEST(VxString, Latin1RoundTripAndUnrepresentableCharacters) {
    std::string all;
    for (int c = 1; c < 256; ++c) all += char(c);
    VxString u = VxString::fromLatin1(all);
    EXPECT_EQ(u.length(), 127u + 2u * 128u);
    EXPECT_EQ(u.toLatin1(), all);
    EXPECT_EQ(VxString::fromLatin1("caf\xE9").str(), "caf\xC3\xA9");

    // One '?' per character outside latin-1, whatever its length in bytes.
    EXPECT_EQ(VxString("a\xE2\x82\xAC" "b\xF0\x9F\x98\x80" "c").toLatin1(), "a?b?c");
    // A broken sequence costs only its own bytes.
    EXPECT_EQ(VxString("\xC3" "A").toLatin1(), "?A");
    EXPECT_EQ(VxString("x\xC3").toLatin1(), "x?");
    EXPECT_EQ(VxString("\xE2\x82" "b").toLatin1(), "?b");
}

TEST(VxString, CaseInsensitiveOperations) {
    VxString s("Image/PNG; mode=8bit");
    EXPECT_TRUE(s.startsWith("image/png", true));
    EXPECT_FALSE(s.startsWith("image/png"));
    EXPECT_FALSE(VxString("img").startsWith("image", true));
    EXPECT_TRUE(s.endsWith("8BIT", true));
    EXPECT_TRUE(s.contains("MODE", true));
    EXPECT_FALSE(s.contains("MODE"));
    EXPECT_EQ(s.toLower(), "image/png; mode=8bit");

    EXPECT_EQ(VxString("EPSG").compare("epsg", true), 0);
    EXPECT_LT(VxString("abc").compare("ABD", true), 0);
    EXPECT_LT(VxString("ab").compare("ABC", true), 0);
    EXPECT_GT(VxString("b").compare("A", true), 0);
    EXPECT_GT(VxString("b").compare("a"), 0);
    EXPECT_LT(VxString("B").compare("a"), 0);  // case counts without the flag
    EXPECT_TRUE(VxStringUtils::isEqualIgnoreCase("WmS", "wMs"));

    EXPECT_EQ(VxString("a&b&&c").replace("&", "&amp;"), "a&amp;b&amp;&amp;c");
    EXPECT_EQ(VxString("aaa").replace("aa", "b"), "ba");
    EXPECT_EQ(VxString("abc").replace("", "x"), "abc");
    EXPECT_EQ(VxString("  t \n").trimmed(), "t");
}

TEST(VxStringUtils, SplitKeepsOrSkipsEmptyPieces) {
    auto v = VxStringUtils::split("a,,b;c,", ",;");
    EXPECT_EQ(v, (std::vector<VxString>{"a", "b", "c"}));
    v = VxStringUtils::split("a,,b;c,", ",;", false);
    EXPECT_EQ(v, (std::vector<VxString>{"a", "", "b", "c", ""}));
    EXPECT_TRUE(VxStringUtils::split("", " ").empty());
    EXPECT_EQ(VxStringUtils::split("  1 2  ", " "), (std::vector<VxString>{"1", "2"}));
}

TEST(VxStringUtils, NumbersIgnoreTheLocale) {
    CommaLocale comma;
    std::setlocale(LC_NUMERIC, "C.UTF-8");
    EXPECT_DOUBLE_EQ(VxStringUtils::atof("3.25"), 3.25);
    EXPECT_DOUBLE_EQ(VxStringUtils::atof("  -2.5e3"), -2500.0);
    EXPECT_DOUBLE_EQ(VxStringUtils::atof("0.5mm"), 0.5);
    bool ok = true;
    EXPECT_EQ(VxStringUtils::atof("abc", ok), 0.0);
    EXPECT_FALSE(ok);
    EXPECT_DOUBLE_EQ(VxStringUtils::atof("1e-3", ok), 0.001);
    EXPECT_TRUE(ok);

    EXPECT_EQ(VxStringBuilder::fixed(1234567.5, 2), "1234567.50");
    EXPECT_EQ(VxStringBuilder::fixed(2.0 / 3.0, 3), "0.667");
    EXPECT_EQ(VxStringBuilder::fixed(-0.25, 0), "-0");
    EXPECT_EQ(VxStringBuilder::fixed(42, 0), "42");

    EXPECT_EQ(VxStringUtils::atoi64("9007199254740993"), INT64_C(9007199254740993));
    EXPECT_EQ(VxStringUtils::atoi64(" -42"), -42);
    EXPECT_EQ(VxStringUtils::atoi64("17abc"), 17);
    EXPECT_EQ(VxStringUtils::atoi64("abc"), 0);
    EXPECT_EQ(VxStringUtils::atoi64("99999999999999999999"), 0);
    EXPECT_EQ(VxStringUtils::itoa(std::numeric_limits<int64_t>::min()), "-9223372036854775808");
    EXPECT_EQ(VxStringUtils::itoa(1234567), "1234567");
}

namespace {
// Counts how often it is written out, i.e. formatted.
struct Counted {
    int* writes;
};
std::ostream& operator<<(std::ostream& o, const Counted& c) {
    ++*c.writes;
    return o << "counted";
}
}  // namespace

TEST(VxLog, LinesBelowTheLevelAreNeitherFormattedNorWritten) {
    LogCapture cap;
    int writes = 0;
    VxLog::logLevel(VxLog::Warning);
    VxLog::logf(VxLog::Info, "value %1%", Counted{&writes});
    VxLog::logf(VxLog::Debug, "value %1%", Counted{&writes});
    VxLog::info("plain");
    VxLog::log(VxLog::Info, "INFO", "direct");
    EXPECT_EQ(writes, 0);
    EXPECT_TRUE(cap.lines.empty());

    VxLog::logf(VxLog::Warning, "value %1% of %2%", Counted{&writes}, VxString("layer"));
    VxLog::error("bad");
    EXPECT_EQ(writes, 1);
    ASSERT_EQ(cap.lines.size(), 2u);
    EXPECT_EQ(cap.lines[0], std::make_pair(3, std::string("value counted of layer")));
    EXPECT_EQ(cap.lines[1], std::make_pair(4, std::string("bad")));

    // A format with too few arguments is written, not thrown.
    EXPECT_NO_THROW(VxLog::logf(VxLog::Error, "%1% and %2%", 1));
    EXPECT_EQ(cap.lines.size(), 3u);

    VxLog::logLevel(VxLog::Debug);
    VxLog::debug("now admitted");
    EXPECT_EQ(cap.lines.back().second, "now admitted");
    EXPECT_STREQ(VxLog::tagOf(VxLog::Warning), "WARNING");
}

TEST(VxRuntime, ErrorEventCallsThreeSlotsAndSwallowsAThrow) {
    VxErrorEvent& ev = VxRuntime::errorEvent();
    std::vector<std::string> calls;
    EXPECT_FALSE(ev.setHandler(3, [](VxEngineObject*, const VxErrorEventArgs&) {}));
    EXPECT_FALSE(ev.setHandler(-1, [](VxEngineObject*, const VxErrorEventArgs&) {}));
    ev.setHandler(0, [&](VxEngineObject*, const VxErrorEventArgs& a) { calls.push_back("0:" + a.message.str()); });
    ev.setHandler(2, [&](VxEngineObject* s, const VxErrorEventArgs&) {
        calls.push_back(s ? "2:sender" : "2:none");
    });
    VxRef<VxEngineObject> sender(new VxEngineObject);
    EXPECT_EQ(ev.raise(sender.get(), {"boom"}), 2);
    EXPECT_EQ(calls, (std::vector<std::string>{"0:boom", "2:sender"}));

    calls.clear();
    ev.setHandler(1, [&](VxEngineObject*, const VxErrorEventArgs&) {
        calls.push_back("1");
        throw std::runtime_error("handler failed");
    });
    int ran = -1;
    EXPECT_NO_THROW(ran = ev.raise(nullptr, {"x"}));
    EXPECT_EQ(ran, 1);
    EXPECT_EQ(calls, (std::vector<std::string>{"0:x", "1"}));

    ev.clear();
    EXPECT_EQ(ev.raise(nullptr, {"y"}), 0);
}

namespace {
struct Probe : VxRefCnt {
    static std::atomic<int> live;
    int value = 7;
    Probe() { ++live; }
    ~Probe() override {
        value = 0;
        --live;
    }
};
std::atomic<int> Probe::live{0};
}  // namespace

TEST(VxRef, CountsAndWeakReferences) {
    Probe::live = 0;
    VxWeakRef<Probe> weak;
    EXPECT_TRUE(weak.lock().isNull());
    {
        VxRef<Probe> strong(new Probe);
        EXPECT_EQ(strong->refCount(), 1);
        weak = strong.get();
        VxWeakRef<Probe> copy(weak);
        VxRef<Probe> again = copy.lock();
        EXPECT_EQ(again.get(), strong.get());
        EXPECT_EQ(strong->refCount(), 2);
        strong = nullptr;
        EXPECT_EQ(Probe::live, 1);  // the locked reference keeps it
        EXPECT_FALSE(weak.expired());
    }
    EXPECT_EQ(Probe::live, 0);
    EXPECT_TRUE(weak.lock().isNull());
    EXPECT_TRUE(weak.expired());

    // Replacing a reference takes the new count before dropping the old one.
    VxRef<Probe> a(new Probe);
    VxRef<Probe> alias = a;
    a = alias;
    a = a.get();
    EXPECT_EQ(a->refCount(), 2);
    alias.reset();
    a = a;
    EXPECT_EQ(Probe::live, 1);
    a = nullptr;
    EXPECT_EQ(Probe::live, 0);
}

// Threads lock a weak reference while the last strong one drops: every lock yields
// either null or a live object, and each object dies exactly once.
TEST(VxRef, WeakLockRacesWithTheLastRelease) {
    Probe::live = 0;
    std::atomic<int> seenAlive{0}, seenBroken{0};
    for (int round = 0; round < 100; ++round) {
        VxRef<Probe> strong(new Probe);
        VxWeakRef<Probe> weak(strong.get());
        std::atomic<bool> go{false};
        std::vector<std::thread> threads;
        for (int t = 0; t < 2; ++t) {
            threads.emplace_back([&, weak] {
                while (!go.load()) std::this_thread::yield();
                for (int k = 0; k < 50; ++k) {
                    VxRef<Probe> p = weak.lock();
                    if (!p) break;
                    if (p->value == 7) ++seenAlive;
                    else ++seenBroken;
                }
            });
        }
        go = true;
        strong = nullptr;
        for (auto& t : threads) t.join();
        EXPECT_TRUE(weak.lock().isNull());
    }
    EXPECT_EQ(seenBroken.load(), 0);
    EXPECT_EQ(Probe::live.load(), 0);
}

namespace {
class ShapeA : public VxEngineObject {
    VX_DECLARE_CLASS()
};
class ShapeB : public ShapeA {
    VX_DECLARE_CLASS()
};
}  // namespace
VX_IMPLEMENT_CLASS(ShapeA, VxEngineObject, 3)
VX_IMPLEMENT_CLASS(ShapeB, ShapeA, 3)

TEST(VxEngineObject, RuntimeClassIdsAreDistinctAndStable) {
    std::vector<int> ids(8);
    std::vector<std::thread> threads;
    for (int t = 0; t < 8; ++t)
        threads.emplace_back([&, t] { ids[t] = (t % 2 ? ShapeB::classId() : ShapeA::classId()); });
    for (auto& t : threads) t.join();
    for (int t = 0; t < 8; ++t) EXPECT_EQ(ids[t], t % 2 ? ShapeB::classId() : ShapeA::classId());
    EXPECT_NE(ShapeA::classId(), ShapeB::classId());
    EXPECT_NE(ShapeA::classId(), VxEngineObject::classId());
    EXPECT_EQ(VxEngineObject::initClassId(ShapeB::runtimeClass()), ShapeB::classId());

    VxRef<VxEngineObject> b(new ShapeB);
    EXPECT_EQ(b->myClassId_(), ShapeB::classId());
    EXPECT_EQ(b->myRuntimeClassName(), "ShapeB");
    EXPECT_TRUE(b->isKindOf(ShapeA::runtimeClass()));
    EXPECT_TRUE(b->isKindOf(VxEngineObject::runtimeClass()));
    EXPECT_FALSE(VxRef<VxEngineObject>(new ShapeA)->isKindOf(ShapeB::runtimeClass()));
    EXPECT_EQ(ShapeB::runtimeClass()->moduleCode, 3);
}

namespace {
struct NamedMeta : ClassMetaData {
    using ClassMetaData::ClassMetaData;
    VxRef<VxRefCnt> parseElement(VxXmlParserContext&, const TiXmlElement*) override { return nullptr; }
};
VxRef<VxRefCnt> noConversion(const VxString&, VxXmlParserContext&) { return nullptr; }
}  // namespace

TEST(VxXmlParserContext, RegistrationByNameInOrder) {
    VxXmlParserContext ctx;
    NamedMeta wms("OgcWmsLayer"), wmts("OgcWmtsLayer"), other("OgcWmsLayer");
    ctx.registerClass(&wms);
    ctx.registerClass(&wmts);
    EXPECT_EQ(ctx.classNames(), (std::vector<VxString>{"OgcWmsLayer", "OgcWmtsLayer"}));
    EXPECT_EQ(ctx.findClass("OgcWmtsLayer"), &wmts);
    EXPECT_EQ(ctx.findClass("ogcwmtslayer"), nullptr);

    // Unregistering another description of the same name leaves the registered one.
    ctx.unregisterClass(&other);
    EXPECT_EQ(ctx.findClass("OgcWmsLayer"), &wms);
    ctx.unregisterClass(&wms);
    ctx.unregisterClass(&wmts);
    EXPECT_TRUE(ctx.classNames().empty());

    ctx.registerTypeConverter("OgcImageFormat", &noConversion);
    EXPECT_EQ(ctx.findTypeConverter("OgcImageFormat"), &noConversion);
    ctx.unregisterTypeConverter("OgcImageFormat");
    EXPECT_EQ(ctx.findTypeConverter("OgcImageFormat"), nullptr);
    EXPECT_TRUE(ctx.typeConverterNames().empty());

    ctx.formatVersion("5.3.0.0");
    EXPECT_EQ(ctx.formatVersion(), "5.3.0.0");
}
