#include "vx/stringutils.h"

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <locale>
#include <sstream>

std::vector<VxString> VxStringUtils::split(const VxString& s, const char* seps, bool skipEmpty) {
    std::vector<VxString> out;
    const std::string& t = s.str();
    std::string cur;
    for (char c : t) {
        if (std::char_traits<char>::find(seps, std::char_traits<char>::length(seps), c)) {
            if (!cur.empty() || !skipEmpty) out.emplace_back(cur);
            cur.clear();
        } else {
            cur += c;
        }
    }
    if (!cur.empty() || !skipEmpty) out.emplace_back(cur);
    return out;
}

double VxStringUtils::atof(const VxString& s, bool& ok) {
    std::istringstream in(s.str());
    in.imbue(std::locale::classic());
    double v = 0;
    in >> v;
    ok = !in.fail();
    return ok ? v : 0.0;
}

double VxStringUtils::atof(const VxString& s) {
    bool ok;
    return atof(s, ok);
}

int64_t VxStringUtils::atoi64(const VxString& s) {
    errno = 0;
    long long v = std::strtoll(s.c_str(), nullptr, 10);
    return errno == ERANGE ? 0 : v;
}

VxString VxStringUtils::itoa(int64_t v) { return VxString(std::to_string(v)); }

bool VxStringUtils::isEqualIgnoreCase(const VxString& a, const VxString& b) {
    return a.compare(b, true) == 0;
}

VxString VxStringBuilder::fixed(double v, int decimals) {
    std::ostringstream o;
    o.imbue(std::locale::classic());
    o.setf(std::ios::fixed);
    o.precision(decimals);
    o << v;
    return VxString(o.str());
}
