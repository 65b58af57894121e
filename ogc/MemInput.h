#pragma once
// A read-only stream buffer over a block of memory, so that a downloaded body can be
// decoded through a std::istream without copying it. The block must outlive the buffer.
#include <streambuf>

class MemInput : public std::streambuf {
public:
    MemInput(const char* begin, const char* end);
    MemInput(const MemInput&) = delete;
    MemInput& operator=(const MemInput&) = delete;
    ~MemInput() override;

protected:
    // A target outside the block changes nothing and yields the invalid position.
    pos_type seekoff(off_type off, std::ios_base::seekdir dir,
                     std::ios_base::openmode which = std::ios_base::in) override;
    pos_type seekpos(pos_type pos, std::ios_base::openmode which = std::ios_base::in) override;
};
