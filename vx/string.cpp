#include "vx/string.h"

#include <algorithm>
#include <cctype>

namespace {
char lowerAscii(char c) { return (c >= 'A' && c <= 'Z') ? char(c - 'A' + 'a') : c; }
char upperAscii(char c) { return (c >= 'a' && c <= 'z') ? char(c - 'a' + 'A') : c; }
bool eqChar(char a, char b, bool ic) { return ic ? lowerAscii(a) == lowerAscii(b) : a == b; }
}

VxString VxString::fromLatin1(const std::string& s) {
    std::string out;
    out.reserve(s.size());
    for (unsigned char c : s) {
        if (c < 0x80) {
            out += char(c);
        } else {
            out += char(0xC0 | (c >> 6));
            out += char(0x80 | (c & 0x3F));
        }
    }
    return VxString(std::move(out));
}

std::string VxString::toLatin1() const {
    std::string out;
    out.reserve(s_.size());
    for (size_t i = 0; i < s_.size();) {
        unsigned char c = s_[i];
        if (c < 0x80) { out += char(c); ++i; continue; }
        int len = (c & 0xE0) == 0xC0 ? 2 : (c & 0xF0) == 0xE0 ? 3 : (c & 0xF8) == 0xF0 ? 4 : 1;
        // A sequence cut short by a byte that is not a continuation ends at that byte,
        // which is then read on its own instead of being swallowed.
        int got = 1;
        while (got < len && i + got < s_.size() && (s_[i + got] & 0xC0) == 0x80) ++got;
        unsigned cp = 0x100;
        if (len == 2 && got == 2) cp = ((c & 0x1F) << 6) | (s_[i + 1] & 0x3F);
        out += cp < 0x100 ? char(cp) : '?';
        i += got;
    }
    return out;
}

bool VxString::startsWith(const VxString& p, bool ic) const {
    if (p.s_.size() > s_.size()) return false;
    for (size_t i = 0; i < p.s_.size(); ++i)
        if (!eqChar(s_[i], p.s_[i], ic)) return false;
    return true;
}

bool VxString::endsWith(const VxString& p, bool ic) const {
    if (p.s_.size() > s_.size()) return false;
    size_t off = s_.size() - p.s_.size();
    for (size_t i = 0; i < p.s_.size(); ++i)
        if (!eqChar(s_[off + i], p.s_[i], ic)) return false;
    return true;
}

bool VxString::contains(const VxString& w, bool ic) const {
    if (!ic) return s_.find(w.s_) != std::string::npos;
    return toLower().s_.find(w.toLower().s_) != std::string::npos;
}

VxString VxString::toLower() const {
    std::string o(s_);
    std::transform(o.begin(), o.end(), o.begin(), lowerAscii);
    return VxString(std::move(o));
}

VxString VxString::toUpper() const {
    std::string o(s_);
    std::transform(o.begin(), o.end(), o.begin(), upperAscii);
    return VxString(std::move(o));
}

VxString VxString::trimmed() const {
    size_t b = 0, e = s_.size();
    while (b < e && std::isspace(static_cast<unsigned char>(s_[b]))) ++b;
    while (e > b && std::isspace(static_cast<unsigned char>(s_[e - 1]))) --e;
    return VxString(s_.substr(b, e - b));
}

VxString VxString::replace(const VxString& what, const VxString& with) const {
    if (what.s_.empty()) return *this;
    std::string o;
    size_t pos = 0;
    for (size_t f; (f = s_.find(what.s_, pos)) != std::string::npos; pos = f + what.s_.size()) {
        o.append(s_, pos, f - pos);
        o += with.s_;
    }
    o.append(s_, pos, std::string::npos);
    return VxString(std::move(o));
}

int VxString::compare(const VxString& other, bool ic) const {
    if (!ic) return s_.compare(other.s_);
    size_t n = std::min(s_.size(), other.s_.size());
    for (size_t i = 0; i < n; ++i) {
        char a = lowerAscii(s_[i]), b = lowerAscii(other.s_[i]);
        if (a != b) return (unsigned char)a < (unsigned char)b ? -1 : 1;
    }
    return s_.size() < other.s_.size() ? -1 : s_.size() > other.s_.size() ? 1 : 0;
}
