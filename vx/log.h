#pragma once
// Engine log: levels 1 DEBUG, 2 INFO, 3 WARNING, 4 ERROR. A line of level n is
// written when the current level is n or lower; formatted lines are built only then.
#include <boost/format.hpp>
#include <functional>
#include <string>

#include "vx/string.h"

class VxLog {
public:
    enum Level { Debug = 1, Info = 2, Warning = 3, Error = 4 };
    using Sink = std::function<void(int level, const char* tag, const std::string& text)>;

    static int logLevel();
    static void logLevel(int level);
    static bool admits(int level) { return level >= logLevel(); }

    // Replaces the sink; an empty function restores the default (standard error).
    static void setSink(Sink sink);

    static void log(int level, const char* tag, const std::string& text);
    static void debug(const std::string& t) { if (admits(Debug)) log(Debug, "DEBUG", t); }
    static void info(const std::string& t) { if (admits(Info)) log(Info, "INFO", t); }
    static void warning(const std::string& t) { if (admits(Warning)) log(Warning, "WARNING", t); }
    static void error(const std::string& t) { if (admits(Error)) log(Error, "ERROR", t); }

    static const char* tagOf(int level);

    // Boost.Format with %1%, %2% placeholders; nothing is formatted when the level drops the line.
    template <class... A>
    static void logf(int level, const char* fmt, const A&... args) {
        if (!admits(level)) return;
        boost::format f(fmt);
        f.exceptions(boost::io::no_error_bits);
        (void)std::initializer_list<int>{((f % fmtArg(args)), 0)...};
        log(level, tagOf(level), f.str());
    }

private:
    template <class T> static const T& fmtArg(const T& v) { return v; }
    static const std::string& fmtArg(const VxString& v) { return v.str(); }
};
