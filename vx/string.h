#pragma once
// The engine's text type: UTF-8 in a std::string.
#include <functional>
#include <ostream>
#include <string>

class VxString {
public:
    VxString() = default;
    VxString(const char* utf8) : s_(utf8 ? utf8 : "") {}
    VxString(const std::string& utf8) : s_(utf8) {}
    VxString(std::string&& utf8) : s_(std::move(utf8)) {}
    VxString(const char* p, size_t n) : s_(p, n) {}

    static VxString fromUtf8(const std::string& s) { return VxString(s); }
    static VxString fromLatin1(const std::string& s);
    std::string toUtf8() const { return s_; }
    // Characters outside latin-1 become '?'.
    std::string toLatin1() const;
    // The active code page is UTF-8 on this platform.
    std::string toActiveCP() const { return s_; }

    const std::string& str() const { return s_; }
    const char* c_str() const { return s_.c_str(); }
    size_t length() const { return s_.size(); }
    bool isEmpty() const { return s_.empty(); }
    bool empty() const { return s_.empty(); }

    bool startsWith(const VxString& prefix, bool ignoreCase = false) const;
    bool endsWith(const VxString& suffix, bool ignoreCase = false) const;
    bool contains(const VxString& what, bool ignoreCase = false) const;
    VxString toLower() const;
    VxString toUpper() const;
    VxString trimmed() const;
    VxString replace(const VxString& what, const VxString& with) const;
    // <0, 0, >0 like strcmp; ASCII case folding when ignoreCase.
    int compare(const VxString& other, bool ignoreCase = false) const;

    VxString& operator+=(const VxString& o) { s_ += o.s_; return *this; }
    VxString& operator+=(const char* o) { s_ += o; return *this; }
    VxString& operator+=(char c) { s_ += c; return *this; }
    friend VxString operator+(VxString a, const VxString& b) { a.s_ += b.s_; return a; }
    friend VxString operator+(VxString a, const char* b) { a.s_ += b; return a; }
    friend VxString operator+(const char* a, const VxString& b) { return VxString(a) + b; }
    friend bool operator==(const VxString& a, const VxString& b) { return a.s_ == b.s_; }
    friend bool operator!=(const VxString& a, const VxString& b) { return a.s_ != b.s_; }
    friend bool operator==(const VxString& a, const char* b) { return a.s_ == b; }
    friend bool operator!=(const VxString& a, const char* b) { return a.s_ != b; }
    friend bool operator<(const VxString& a, const VxString& b) { return a.s_ < b.s_; }
    friend std::ostream& operator<<(std::ostream& o, const VxString& s) { return o << s.s_; }

private:
    std::string s_;
};

namespace std {
template <> struct hash<VxString> {
    size_t operator()(const VxString& s) const { return hash<string>()(s.str()); }
};
}
