#pragma once
// Command-line options shared by every subcommand of the vxogc program.
#include <map>
#include <stdexcept>
#include <string>
#include <vector>

struct CliOptions {
    std::vector<std::string> positional;
    std::map<std::string, std::string> values;  // --name value
    std::map<std::string, bool> flags;          // --name
    int timeout = 10;
    std::string user, password;

    bool flag(const std::string& n) const { return flags.count(n) != 0; }
    std::string value(const std::string& n, const std::string& def = "") const {
        auto it = values.find(n);
        return it == values.end() ? def : it->second;
    }
    bool has(const std::string& n) const { return values.count(n) != 0; }
};

// Parses argv after the subcommand. valueOptions names the options that take a value;
// anything else starting with "--" is a flag. Throws std::runtime_error on bad input.
CliOptions parseCliOptions(int argc, char** argv, int first, const std::vector<std::string>& valueOptions);
