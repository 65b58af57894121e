#include "options.h"

#include <algorithm>
#include <cstdlib>

#include "vx/log.h"

CliOptions parseCliOptions(int argc, char** argv, int first, const std::vector<std::string>& valueOptions) {
    CliOptions o;
    std::vector<std::string> withValue = valueOptions;
    for (const char* common : {"timeout", "user", "password", "log-level"}) withValue.push_back(common);
    for (int i = first; i < argc; ++i) {
        std::string a = argv[i];
        if (a == "-o") a = "--o";  // the one short option: the output file
        if (a.rfind("--", 0) != 0 || a == "--") {
            o.positional.push_back(a);
            continue;
        }
        std::string name = a.substr(2), val;
        const size_t eq = name.find('=');
        const bool inlineValue = eq != std::string::npos;
        if (inlineValue) {
            val = name.substr(eq + 1);
            name = name.substr(0, eq);
        }
        if (std::find(withValue.begin(), withValue.end(), name) != withValue.end()) {
            if (!inlineValue) {
                if (i + 1 >= argc) throw std::runtime_error("option --" + name + " needs a value");
                val = argv[++i];
            }
            o.values[name] = val;
        } else {
            o.flags[name] = true;
        }
    }
    if (o.has("timeout")) {
        char* end = nullptr;
        long t = std::strtol(o.value("timeout").c_str(), &end, 10);
        if (!end || *end || t < 0 || t > 86400) throw std::runtime_error("--timeout needs a number of seconds");
        o.timeout = static_cast<int>(t);
    }
    o.user = o.value("user");
    o.password = o.value("password");
    // Without --log-level the engine log stays quiet: failures reach the user as the
    // program's own one-line message.
    const std::string level = o.value("log-level", "none");
    if (level == "none") VxLog::logLevel(VxLog::Error + 1);
    else if (level == "debug") VxLog::logLevel(VxLog::Debug);
    else if (level == "info") VxLog::logLevel(VxLog::Info);
    else if (level == "warning") VxLog::logLevel(VxLog::Warning);
    else if (level == "error") VxLog::logLevel(VxLog::Error);
    else throw std::runtime_error("--log-level must be debug, info, warning or error");
    return o;
}
