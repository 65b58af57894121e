#pragma once
#include <cstdint>
#include <string>
#include <vector>

#include "vx/string.h"

class VxStringUtils {
public:
    // Splits at any of the separator characters; empty pieces are dropped when skipEmpty.
    static std::vector<VxString> split(const VxString& s, const char* separators, bool skipEmpty = true);
    // Locale-independent; leading white space skipped; 0 when nothing parses.
    static double atof(const VxString& s);
    static double atof(const VxString& s, bool& ok);
    static int64_t atoi64(const VxString& s);
    static VxString itoa(int64_t v);
    static bool isEqualIgnoreCase(const VxString& a, const VxString& b);
};

class VxStringBuilder {
public:
    // Fixed-point text with the given number of decimals, locale-independent.
    static VxString fixed(double v, int decimals);
};
