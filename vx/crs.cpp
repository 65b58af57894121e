#include "vx/crs.h"

#include <proj.h>

#include <algorithm>
#include <cmath>
#include <map>
#include <mutex>
#include <string>
#include <utility>
#include <vector>

#include "vx/exception.h"
#include "vx/log.h"
#include "vx/stringutils.h"

// What the engine needs to know about a system, read once from PROJ's registry when
// the system is first made. Immutable afterwards, so any thread may read it.
struct VxCrs::Impl {
    std::string projAuthority;  // as PROJ's database names it ("OGC" for "CRS:84")
    std::string projCode;
    std::string name;
    bool geographic = false;
    bool webMercator = false;
    double lengthUnit = 1.0;
    int axisCount = 0;
    VxCrsAxisDirection axes[3] = {VxCrsAxisUnknown, VxCrsAxisUnknown, VxCrsAxisUnknown};
};

namespace {

const double kEarthRadius = 6378137.0;
const double kWebMercatorHalfWorld = 20037508.342789244;

void projLog(void*, int, const char* msg) {
    if (VxLog::admits(VxLog::Debug)) VxLog::debug(std::string("PROJ: ") + (msg ? msg : ""));
}

// PROJ objects are bound to a context and a context must not be shared between
// threads, so every thread keeps its own context, its own copies of the systems and
// its own transformations. Interned systems live for the process, so their addresses
// are stable keys.
class ThreadState {
public:
    ThreadState() {
        ctx_ = proj_context_create();
        if (ctx_) {
            proj_context_set_enable_network(ctx_, 0);
            proj_log_func(ctx_, nullptr, projLog);
        }
    }
    ~ThreadState() {
        for (auto& e : ops_) if (e.second) proj_destroy(e.second);
        for (auto& e : crs_) if (e.second) proj_destroy(e.second);
        if (ctx_) proj_context_destroy(ctx_);
    }
    ThreadState(const ThreadState&) = delete;
    ThreadState& operator=(const ThreadState&) = delete;

    PJ_CONTEXT* ctx() const { return ctx_; }

    // Takes ownership of a system object made in this thread.
    void adopt(const VxCrs::Impl* impl, PJ* pj) { crs_[impl] = pj; }

    PJ* crs(const VxCrs::Impl* impl) {
        auto it = crs_.find(impl);
        if (it != crs_.end()) return it->second;
        PJ* pj = ctx_ ? proj_create_from_database(ctx_, impl->projAuthority.c_str(),
                                                  impl->projCode.c_str(), PJ_CATEGORY_CRS, 0,
                                                  nullptr)
                      : nullptr;
        crs_[impl] = pj;
        return pj;
    }

    // East/north in, east/north out; failures are remembered too, as null.
    PJ* operation(const VxCrs::Impl* from, const VxCrs::Impl* to) {
        auto key = std::make_pair(from, to);
        auto it = ops_.find(key);
        if (it != ops_.end()) return it->second;
        PJ* result = nullptr;
        PJ* a = crs(from);
        PJ* b = crs(to);
        if (a && b) {
            PJ* raw = proj_create_crs_to_crs_from_pj(ctx_, a, b, nullptr, nullptr);
            if (raw) {
                result = proj_normalize_for_visualization(ctx_, raw);
                proj_destroy(raw);
            }
        }
        if (!result) {
            VxLog::logf(VxLog::Warning, "No transformation from %1%:%2% to %3%:%4%",
                        from->projAuthority, from->projCode, to->projAuthority, to->projCode);
        }
        ops_[key] = result;
        return result;
    }

    bool equivalent(const VxCrs::Impl* a, const VxCrs::Impl* b) {
        if (a == b) return true;
        auto key = a < b ? std::make_pair(a, b) : std::make_pair(b, a);
        auto it = equivalent_.find(key);
        if (it != equivalent_.end()) return it->second;
        PJ* pa = crs(a);
        PJ* pb = crs(b);
        bool eq = pa && pb &&
                  proj_is_equivalent_to_with_ctx(ctx_, pa, pb,
                                                 PJ_COMP_EQUIVALENT_EXCEPT_AXIS_ORDER_GEOGCRS) != 0;
        equivalent_[key] = eq;
        return eq;
    }

private:
    PJ_CONTEXT* ctx_ = nullptr;
    std::map<const VxCrs::Impl*, PJ*> crs_;
    std::map<std::pair<const VxCrs::Impl*, const VxCrs::Impl*>, PJ*> ops_;
    std::map<std::pair<const VxCrs::Impl*, const VxCrs::Impl*>, bool> equivalent_;
};

ThreadState& threadState() {
    thread_local ThreadState state;
    return state;
}

// Interned systems, never released: callers compare them by address.
struct Registry {
    std::mutex mutex;
    std::map<std::pair<std::string, std::string>, VxRef<VxCrs>> entries;
};

Registry& registry() {
    static Registry* r = new Registry;
    return *r;
}

VxCrsAxisDirection directionOf(const char* d) {
    if (!d) return VxCrsAxisUnknown;
    static const struct { const char* name; VxCrsAxisDirection dir; } table[] = {
        {"north", VxCrsAxisNorth}, {"south", VxCrsAxisSouth}, {"east", VxCrsAxisEast},
        {"west", VxCrsAxisWest},   {"up", VxCrsAxisUp},       {"down", VxCrsAxisDown}};
    for (const auto& e : table)
        if (VxStringUtils::isEqualIgnoreCase(d, e.name)) return e.dir;
    if (!*d || VxStringUtils::isEqualIgnoreCase(d, "unspecified")) return VxCrsAxisUnknown;
    return VxCrsAxisOther;
}

// The part of a system that carries x and y: the first member of a compound system,
// the source of a bound one. The caller destroys the result.
PJ* horizontalOf(PJ_CONTEXT* ctx, PJ* pj) {
    switch (proj_get_type(pj)) {
    case PJ_TYPE_COMPOUND_CRS: {
        PJ* sub = proj_crs_get_sub_crs(ctx, pj, 0);
        if (!sub) return nullptr;
        PJ* h = horizontalOf(ctx, sub);
        proj_destroy(sub);
        return h;
    }
    case PJ_TYPE_BOUND_CRS: {
        PJ* src = proj_get_source_crs(ctx, pj);
        if (!src) return nullptr;
        PJ* h = horizontalOf(ctx, src);
        proj_destroy(src);
        return h;
    }
    default:
        return proj_clone(ctx, pj);
    }
}

void describe(PJ_CONTEXT* ctx, PJ* pj, VxCrs::Impl& impl) {
    const char* name = proj_get_name(pj);
    impl.name = name ? name : "";
    PJ* h = horizontalOf(ctx, pj);
    if (!h) return;
    const PJ_TYPE type = proj_get_type(h);
    impl.geographic = type == PJ_TYPE_GEOGRAPHIC_2D_CRS || type == PJ_TYPE_GEOGRAPHIC_3D_CRS ||
                      type == PJ_TYPE_GEOGRAPHIC_CRS;
    if (PJ* cs = proj_crs_get_coordinate_system(ctx, h)) {
        const int count = proj_cs_get_axis_count(ctx, cs);
        impl.axisCount = std::max(0, std::min(count, 3));
        for (int i = 0; i < impl.axisCount; ++i) {
            const char* direction = nullptr;
            double factor = 0;
            if (proj_cs_get_axis_info(ctx, cs, i, nullptr, nullptr, &direction, &factor, nullptr,
                                      nullptr, nullptr)) {
                impl.axes[i] = directionOf(direction);
                if (i == 0 && factor > 0)
                    // Angular factors are radians per unit; a radian spans one earth radius.
                    impl.lengthUnit = impl.geographic ? factor * kEarthRadius : factor;
            }
        }
        proj_destroy(cs);
    }
    if (type == PJ_TYPE_PROJECTED_CRS) {
        if (PJ* op = proj_crs_get_coordoperation(ctx, h)) {
            const char* methodName = nullptr;
            const char* methodAuthority = nullptr;
            const char* methodCode = nullptr;
            if (proj_coordoperation_get_method_info(ctx, op, &methodName, &methodAuthority,
                                                    &methodCode)) {
                impl.webMercator =
                    (methodAuthority && methodCode && std::string(methodAuthority) == "EPSG" &&
                     std::string(methodCode) == "1024") ||
                    (methodName && VxString(methodName).contains("Pseudo Mercator", true));
            }
            proj_destroy(op);
        }
    }
    proj_destroy(h);
}

// Transforms points in place; false when no transformation can be set up.
bool transformPoints(const VxCrs::Impl* from, const VxCrs::Impl* to, double* x, double* y,
                     size_t n) {
    if (from == to) return true;
    PJ* op = threadState().operation(from, to);
    if (!op) return false;
    if (n == 0) return true;
    proj_trans_generic(op, PJ_FWD, x, sizeof(double), n, y, sizeof(double), n, nullptr, 0, 0,
                       nullptr, 0, 0);
    for (size_t i = 0; i < n; ++i) {
        if (!std::isfinite(x[i]) || !std::isfinite(y[i])) x[i] = y[i] = HUGE_VAL;
    }
    return true;
}

[[noreturn]] void unknownCrs(const VxString& what) {
    VX_THROW(VxException, "Unknown coordinate reference system " + what);
}

// Where a grid of samples and the points found on the edge of the valid area land.
struct Samples {
    std::vector<double> x, y;
    std::vector<int> from;  // index of the grid sample a point was found from, or -1
};

}  // namespace

VxCrs::VxCrs(const VxString& authority, const VxString& code, Impl* impl)
    : authority_(authority), code_(code), impl_(impl) {}

VxCrs::~VxCrs() { delete impl_; }

VxRef<VxCrs> VxCrs::fromAuthorityAndCode(const VxString& authority, const VxString& code) {
    VxString auth = authority.trimmed().toUpper();
    VxString c = code.trimmed();
    // "OGC:CRS84" and "CRS:84" are one system.
    if (auth == "OGC" && c.length() > 3 && c.startsWith("CRS", true)) {
        auth = "CRS";
        c = VxString(c.str().substr(3));
    }
    if (auth.isEmpty() || c.isEmpty()) unknownCrs(auth + ":" + c);

    Registry& reg = registry();
    std::lock_guard<std::mutex> lock(reg.mutex);
    const auto key = std::make_pair(auth.str(), c.str());
    auto it = reg.entries.find(key);
    if (it != reg.entries.end()) return it->second;

    Impl* impl = new Impl;
    if (auth == "CRS") {
        impl->projAuthority = "OGC";
        impl->projCode = "CRS" + c.str();
    } else {
        impl->projAuthority = auth.str();
        impl->projCode = c.str();
    }
    ThreadState& ts = threadState();
    PJ* pj = ts.ctx() ? proj_create_from_database(ts.ctx(), impl->projAuthority.c_str(),
                                                  impl->projCode.c_str(), PJ_CATEGORY_CRS, 0,
                                                  nullptr)
                      : nullptr;
    if (!pj) {
        delete impl;
        unknownCrs(auth + ":" + c);
    }
    describe(ts.ctx(), pj, *impl);
    ts.adopt(impl, pj);
    VxRef<VxCrs> crs(new VxCrs(auth, c, impl));
    reg.entries.emplace(key, crs);
    return crs;
}

VxRef<VxCrs> VxCrs::fromUrn(const VxString& urn) {
    const VxString s = urn.trimmed();
    static const char* const prefixes[] = {"urn:ogc:def:crs:", "urn:x-ogc:def:crs:",
                                           "http://www.opengis.net/def/crs/"};
    for (const char* prefix : prefixes) {
        if (!s.startsWith(prefix, true)) continue;
        const std::string rest = s.str().substr(std::string(prefix).size());
        const char sep = rest.find('/') != std::string::npos ? '/' : ':';
        // authority, [version,] code; the version may be empty ("EPSG::4326").
        std::vector<std::string> parts;
        size_t start = 0;
        for (;;) {
            size_t p = rest.find(sep, start);
            parts.push_back(rest.substr(start, p == std::string::npos ? p : p - start));
            if (p == std::string::npos) break;
            start = p + 1;
        }
        if (parts.size() == 2 || parts.size() == 3)
            return fromAuthorityAndCode(parts.front(), parts.back());
        unknownCrs(urn);
    }
    static const char* const epsgXml = "http://www.opengis.net/gml/srs/epsg.xml#";
    if (s.startsWith(epsgXml, true))
        return fromAuthorityAndCode("EPSG", s.str().substr(std::string(epsgXml).size()));
    const size_t colon = s.str().find(':');
    if (colon != std::string::npos && s.str().find(':', colon + 1) == std::string::npos)
        return fromAuthorityAndCode(s.str().substr(0, colon), s.str().substr(colon + 1));
    unknownCrs(urn);
}

VxRef<VxCrs> VxCrs::wgs84LongLat() {
    static const VxRef<VxCrs> crs = fromAuthorityAndCode("EPSG", "4326");
    return crs;
}

VxCrsAxisDirection VxCrs::authoritativeAxisDirection(int axis, const VxString& authority,
                                                     const VxString& code) {
    VxRef<VxCrs> crs;
    try {
        crs = fromAuthorityAndCode(authority, code);
    } catch (const VxException&) {
        return VxCrsAxisUnknown;
    }
    if (axis < 0 || axis >= crs->impl_->axisCount) return VxCrsAxisUnknown;
    return crs->impl_->axes[axis];
}

VxString VxCrs::id() const { return authority_ + ":" + code_; }

VxString VxCrs::name() const { return impl_->name; }

bool VxCrs::isGeographic() const { return impl_->geographic; }

double VxCrs::lengthUnit() const { return impl_->lengthUnit; }

bool VxCrs::compatibleWith(const VxRef<VxCrs>& other) const {
    if (!other) return false;
    return sameAs(*other);
}

bool VxCrs::sameAs(const VxCrs& other) const {
    return this == &other || threadState().equivalent(impl_, other.impl_);
}

bool VxCrs::transform(const VxRef<VxCrs>& target, double* x, double* y, size_t n) const {
    return target && transformPoints(impl_, target->impl_, x, y, n);
}

bool VxCrs::projectTo(const VxRef<VxCrs>& target, VxRect& rect, VxRect& second) const {
    second = VxRect();
    const VxRect src = rect;
    rect = VxRect();
    if (!target || !src.isValid()) return false;

    // A grid of samples over the whole rectangle: its edges alone can miss extremes
    // inside (a pole, the top of a curved parallel).
    const int N = 21;
    auto sx = [&](int i) { return i == N - 1 ? src.maxx : src.minx + src.width() * i / (N - 1); };
    auto sy = [&](int j) { return j == N - 1 ? src.maxy : src.miny + src.height() * j / (N - 1); };
    Samples s;
    s.x.resize(N * N);
    s.y.resize(N * N);
    s.from.assign(N * N, -1);
    for (int j = 0; j < N; ++j)
        for (int i = 0; i < N; ++i) {
            s.x[j * N + i] = sx(i);
            s.y[j * N + i] = sy(j);
        }
    if (!transform(target, s.x.data(), s.y.data(), s.x.size())) return false;
    auto valid = [&](int k) { return s.x[k] != HUGE_VAL; };

    std::vector<std::pair<int, int>> neighbours;
    for (int j = 0; j < N; ++j)
        for (int i = 0; i < N; ++i) {
            if (i + 1 < N) neighbours.emplace_back(j * N + i, j * N + i + 1);
            if (j + 1 < N) neighbours.emplace_back(j * N + i, (j + 1) * N + i);
        }

    // Where a sample fails next to one that does not, the valid area ends between them:
    // find that edge by bisection so that the result reaches it.
    for (const auto& nb : neighbours) {
        if (valid(nb.first) == valid(nb.second)) continue;
        const int good = valid(nb.first) ? nb.first : nb.second;
        const int bad = good == nb.first ? nb.second : nb.first;
        double gx = sx(good % N), gy = sy(good / N), bx = sx(bad % N), by = sy(bad / N);
        double rx = HUGE_VAL, ry = HUGE_VAL;
        for (int step = 0; step < 24; ++step) {
            double mx = (gx + bx) / 2, my = (gy + by) / 2;
            double tx = mx, ty = my;
            transform(target, &tx, &ty, 1);
            if (tx != HUGE_VAL) {
                gx = mx; gy = my; rx = tx; ry = ty;
            } else {
                bx = mx; by = my;
            }
        }
        if (rx != HUGE_VAL) {
            s.x.push_back(rx);
            s.y.push_back(ry);
            s.from.push_back(good);
        }
    }

    const size_t total = s.x.size();
    if (!target->isGeographic()) {
        VxRect r;
        bool any = false;
        for (size_t k = 0; k < total; ++k) {
            if (s.x[k] == HUGE_VAL) continue;
            double x = s.x[k], y = s.y[k];
            if (target->impl_->webMercator) {
                x = std::max(-kWebMercatorHalfWorld, std::min(kWebMercatorHalfWorld, x));
                y = std::max(-kWebMercatorHalfWorld, std::min(kWebMercatorHalfWorld, y));
            }
            if (!any) {
                r = VxRect(x, y, x, y);
                any = true;
            } else {
                r.minx = std::min(r.minx, x); r.maxx = std::max(r.maxx, x);
                r.miny = std::min(r.miny, y); r.maxy = std::max(r.maxy, y);
            }
        }
        if (!any || !r.isValid()) return false;
        rect = r;
        return false;
    }

    // Geographic target: longitudes wrap at +-180. Unwrap them by walking the grid so
    // that neighbours never differ by more than half a turn; a result wider than
    // [-180, 180] then crosses the antimeridian.
    std::vector<double> lon(total, HUGE_VAL);
    std::vector<char> seen(N * N, 0);
    std::vector<std::vector<int>> adjacent(N * N);
    for (const auto& nb : neighbours) {
        adjacent[nb.first].push_back(nb.second);
        adjacent[nb.second].push_back(nb.first);
    }
    auto unwrapNear = [](double value, double reference) {
        return value + 360.0 * std::round((reference - value) / 360.0);
    };
    std::vector<int> queue;
    for (int seed = 0; seed < N * N; ++seed) {
        if (seen[seed] || !valid(seed)) continue;
        seen[seed] = 1;
        lon[seed] = s.x[seed];
        queue.assign(1, seed);
        for (size_t q = 0; q < queue.size(); ++q) {
            const int cur = queue[q];
            for (int next : adjacent[cur]) {
                if (seen[next] || !valid(next)) continue;
                seen[next] = 1;
                lon[next] = unwrapNear(s.x[next], lon[cur]);
                queue.push_back(next);
            }
        }
    }
    for (size_t k = N * N; k < total; ++k) lon[k] = unwrapNear(s.x[k], lon[s.from[k]]);

    double minLon = HUGE_VAL, maxLon = -HUGE_VAL, minLat = HUGE_VAL, maxLat = -HUGE_VAL;
    for (size_t k = 0; k < total; ++k) {
        if (s.x[k] == HUGE_VAL) continue;
        minLon = std::min(minLon, lon[k]); maxLon = std::max(maxLon, lon[k]);
        minLat = std::min(minLat, s.y[k]); maxLat = std::max(maxLat, s.y[k]);
    }
    if (minLon == HUGE_VAL) return false;

    // A pole inside a projected area: every longitude is in it.
    if (!isGeographic()) {
        for (double pole : {90.0, -90.0}) {
            double px = 0, py = pole;
            if (!transformPoints(target->impl_, impl_, &px, &py, 1) || px == HUGE_VAL)
                continue;
            if (px > src.minx && px < src.maxx && py > src.miny && py < src.maxy) {
                minLon = -180; maxLon = 180;
                minLat = std::min(minLat, pole); maxLat = std::max(maxLat, pole);
            }
        }
    }
    minLat = std::max(-90.0, minLat);
    maxLat = std::min(90.0, maxLat);
    if (!(maxLat > minLat)) return false;

    if (maxLon - minLon >= 360.0) {
        minLon = -180;
        maxLon = 180;
    } else {
        const double turns = std::floor((minLon + 180.0) / 360.0);
        minLon -= 360.0 * turns;
        maxLon -= 360.0 * turns;
    }
    if (maxLon <= 180.0) {
        if (!(maxLon > minLon)) return false;
        rect = VxRect(minLon, minLat, maxLon, maxLat);
        return false;
    }
    // minLon now lies in [-180, 180): the first piece runs east to +180, the second
    // on from -180.
    rect = VxRect(minLon, minLat, 180.0, maxLat);
    second = VxRect(-180.0, minLat, maxLon - 360.0, maxLat);
    return true;
}
