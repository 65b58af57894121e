#pragma once
// Captures engine log lines for assertions; restores the default sink when destroyed.
#include <algorithm>
#include <mutex>
#include <string>
#include <vector>

#include "vx/log.h"

struct LogCapture {
    struct Line {
        int level;
        std::string text;
    };
    explicit LogCapture(int level = VxLog::Debug) : oldLevel(VxLog::logLevel()) {
        VxLog::logLevel(level);
        VxLog::setSink([this](int l, const char*, const std::string& t) {
            std::lock_guard<std::mutex> g(m);
            lines.push_back({l, t});
        });
    }
    ~LogCapture() {
        VxLog::setSink(nullptr);
        VxLog::logLevel(oldLevel);
    }
    std::vector<Line> all() {
        std::lock_guard<std::mutex> g(m);
        return lines;
    }
    size_t count(const std::string& text, int level = 0) {
        std::lock_guard<std::mutex> g(m);
        return std::count_if(lines.begin(), lines.end(),
                             [&](const Line& l) { return l.text == text && (level == 0 || l.level == level); });
    }
    size_t countContaining(const std::string& part) {
        std::lock_guard<std::mutex> g(m);
        return std::count_if(lines.begin(), lines.end(),
                             [&](const Line& l) { return l.text.find(part) != std::string::npos; });
    }
    int oldLevel;
    std::mutex m;
    std::vector<Line> lines;
};
