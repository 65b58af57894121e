#include "vx/exception.h"

#include "vx/log.h"

VxException::VxException(const char* file, int line, const VxString& a1, const VxString& a2,
                         const VxString& a3)
    : file_(file ? file : ""), line_(line), args_{a1, a2, a3} {}

VxException::~VxException() = default;

const char* VxException::errorId() const { return "Exception"; }
const char* VxException::messageTemplate() const { return "$1"; }

VxString VxException::asString() const {
    // One pass, so that an argument that itself holds "$2" is not expanded again.
    const std::string t = messageTemplate();
    std::string out;
    for (size_t i = 0; i < t.size(); ++i) {
        if (t[i] == '$' && i + 1 < t.size() && t[i + 1] >= '1' && t[i + 1] <= '3') {
            out += args_[t[i + 1] - '1'].str();
            ++i;
        } else {
            out += t[i];
        }
    }
    return VxString(std::move(out));
}

void VxException::logException() const {
    if (!VxLog::admits(VxLog::Error)) return;
    VxLog::log(VxLog::Error, "ERROR",
               std::string(errorId()) + ": " + asString().str() + " (" + file_ + ":" +
                   std::to_string(line_) + ")");
}

const char* VxException::what() const noexcept {
    try {
        what_ = asString().str();
    } catch (...) {
        return "VxException";
    }
    return what_.c_str();
}
