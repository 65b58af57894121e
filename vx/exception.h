#pragma once
// Base of every error the engine reports: raising file and line, three message
// arguments for the $1..$3 placeholders of the class's template.
#include <exception>
#include <string>

#include "vx/string.h"

class VxException : public std::exception {
public:
    VxException(const char* file, int line, const VxString& a1 = VxString(),
                const VxString& a2 = VxString(), const VxString& a3 = VxString());
    VxException(const VxException&) = default;
    ~VxException() override;

    virtual const char* errorId() const;
    virtual const char* messageTemplate() const;

    // The template with $1, $2, $3 replaced by the arguments.
    VxString asString() const;
    // Writes the message to the engine log at error level.
    void logException() const;

    const char* file() const { return file_.c_str(); }
    int line() const { return line_; }
    const VxString& arg(int i) const { return args_[i < 0 ? 0 : i > 2 ? 2 : i]; }
    const char* what() const noexcept override;

private:
    std::string file_;
    int line_;
    VxString args_[3];
    mutable std::string what_;
};

// Shorthand for raising with the current source position.
#define VX_THROW(Cls, ...) throw Cls(__FILE__, __LINE__, ##__VA_ARGS__)
