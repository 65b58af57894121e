#include "vx/log.h"

#include <atomic>
#include <cstdio>
#include <memory>
#include <mutex>

namespace {
std::atomic<int> g_level{VxLog::Info};
std::mutex g_sinkMutex;
VxLog::Sink& sinkRef() {
    static VxLog::Sink s;
    return s;
}
}

int VxLog::logLevel() { return g_level.load(std::memory_order_relaxed); }
void VxLog::logLevel(int level) { g_level.store(level, std::memory_order_relaxed); }

void VxLog::setSink(Sink sink) {
    std::lock_guard<std::mutex> g(g_sinkMutex);
    sinkRef() = std::move(sink);
}

const char* VxLog::tagOf(int level) {
    switch (level) {
    case Debug: return "DEBUG";
    case Info: return "INFO";
    case Warning: return "WARNING";
    default: return "ERROR";
    }
}

void VxLog::log(int level, const char* tag, const std::string& text) {
    if (!admits(level)) return;
    std::lock_guard<std::mutex> g(g_sinkMutex);
    if (sinkRef()) {
        sinkRef()(level, tag, text);
        return;
    }
    std::fprintf(stderr, "[%s] %s\n", tag, text.c_str());
}
