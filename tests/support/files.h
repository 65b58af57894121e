#pragma once
// Reading test inputs: whole files, and documents of the shared corpus.
#include <fstream>
#include <sstream>
#include <stdexcept>
#include <string>

inline std::string readFile(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    if (!in) throw std::runtime_error("cannot read test input " + path);
    std::stringstream ss;
    ss << in.rdbuf();
    return ss.str();
}
