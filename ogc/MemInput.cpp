#include "ogc/MemInput.h"

#include "ogc/errors.h"

MemInput::MemInput(const char* begin, const char* end) {
    // The get area never writes, so dropping const is safe.
    char* b = const_cast<char*>(begin);
    char* e = const_cast<char*>(end);
    setg(b, b, e);
}

MemInput::~MemInput() = default;

MemInput::pos_type MemInput::seekoff(off_type off, std::ios_base::seekdir dir,
                                     std::ios_base::openmode) {
    char* base;
    if (dir == std::ios_base::beg)
        base = eback();
    else if (dir == std::ios_base::cur)
        base = gptr();
    else if (dir == std::ios_base::end)
        base = egptr();
    else
        throw VxXGenericException("MemInput", __LINE__, "OGC.MemInput: Invalid seekdir.");

    // Bounds are checked on offsets, before any pointer or sum is formed, so that
    // no offset can overflow or make an out-of-range pointer.
    const off_type size = egptr() - eback();
    const off_type from = base - eback();
    if (off < -from || off > size - from) return pos_type(off_type(-1));
    const off_type target = from + off;
    setg(eback(), eback() + target, egptr());
    return pos_type(target);
}

MemInput::pos_type MemInput::seekpos(pos_type pos, std::ios_base::openmode which) {
    return seekoff(off_type(pos), std::ios_base::beg, which);
}
