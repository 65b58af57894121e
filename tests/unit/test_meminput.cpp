#include <gtest/gtest.h>

#include <cstdint>
#include <istream>
#include <limits>
#include <string>

#include "ogc/MemInput.h"
#include "ogc/errors.h"

namespace {
const std::string kBlock = "0123456789";
}

TEST(MemInput, ReadsTheBlockThroughAnIstream) {
    MemInput buf(kBlock.data(), kBlock.data() + kBlock.size());
    std::istream in(&buf);
    std::string all((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
    EXPECT_EQ(all, kBlock);

    // The buffer reads the caller's memory, not a copy.
    std::string data = "abc";
    MemInput live(data.data(), data.data() + data.size());
    data[1] = 'X';
    std::istream in2(&live);
    std::string got;
    in2 >> got;
    EXPECT_EQ(got, "aXc");
}

TEST(MemInput, SeeksRelativeToEachBasePoint) {
    MemInput buf(kBlock.data(), kBlock.data() + kBlock.size());
    std::istream in(&buf);

    in.seekg(0, std::ios_base::end);
    EXPECT_EQ(in.tellg(), std::streampos(10));
    EXPECT_EQ(in.get(), std::char_traits<char>::eof());
    in.clear();

    in.seekg(4, std::ios_base::beg);
    EXPECT_EQ(in.get(), '4');
    in.seekg(2, std::ios_base::cur);  // from 5
    EXPECT_EQ(in.get(), '7');
    in.seekg(-3, std::ios_base::end);
    std::streampos mark = in.tellg();
    EXPECT_EQ(mark, std::streampos(7));
    EXPECT_EQ(in.get(), '7');
    in.seekg(-8, std::ios_base::cur);
    EXPECT_EQ(in.get(), '0');

    // A position from one seek leads back to the same byte.
    in.seekg(mark);
    EXPECT_EQ(in.get(), '7');
    EXPECT_EQ(in.get(), '8');
}

TEST(MemInput, SeekOutsideTheBlockChangesNothing) {
    MemInput buf(kBlock.data(), kBlock.data() + kBlock.size());
    using off = std::streamoff;
    ASSERT_EQ(buf.pubseekoff(3, std::ios_base::beg), std::streampos(3));

    EXPECT_EQ(buf.pubseekoff(-1, std::ios_base::beg), std::streampos(off(-1)));
    EXPECT_EQ(buf.sgetc(), '3');
    EXPECT_EQ(buf.pubseekoff(1, std::ios_base::end), std::streampos(off(-1)));
    EXPECT_EQ(buf.sgetc(), '3');
    EXPECT_EQ(buf.pubseekoff(-4, std::ios_base::cur), std::streampos(off(-1)));
    EXPECT_EQ(buf.pubseekpos(11), std::streampos(off(-1)));
    // Offsets so large that adding them to the base would overflow.
    EXPECT_EQ(buf.pubseekoff(std::numeric_limits<off>::max(), std::ios_base::cur), std::streampos(off(-1)));
    EXPECT_EQ(buf.pubseekoff(std::numeric_limits<off>::min(), std::ios_base::end), std::streampos(off(-1)));
    EXPECT_EQ(buf.sbumpc(), '3');

    // The failed seek shows as a failed stream, and the next read still gets the old byte.
    std::istream in(&buf);
    in.seekg(-1, std::ios_base::beg);
    EXPECT_TRUE(in.fail());
    in.clear();
    EXPECT_EQ(in.get(), '4');
}

TEST(MemInput, EmptyBlock) {
    const char* p = kBlock.data();
    MemInput buf(p, p);
    EXPECT_EQ(buf.sgetc(), std::char_traits<char>::eof());
    EXPECT_EQ(buf.pubseekoff(0, std::ios_base::beg), std::streampos(0));
    EXPECT_EQ(buf.pubseekoff(0, std::ios_base::end), std::streampos(0));
    EXPECT_EQ(buf.pubseekoff(1, std::ios_base::beg), std::streampos(std::streamoff(-1)));
    std::istream in(&buf);
    EXPECT_EQ(in.get(), std::char_traits<char>::eof());
}

TEST(MemInput, InvalidDirectionThrows) {
    MemInput buf(kBlock.data(), kBlock.data() + kBlock.size());
    buf.pubseekoff(2, std::ios_base::beg);
    try {
        buf.pubseekoff(0, static_cast<std::ios_base::seekdir>(7));
        FAIL() << "no exception";
    } catch (const VxXGenericException& e) {
        EXPECT_EQ(e.asString(), "OGC.MemInput: Invalid seekdir.");
        EXPECT_STREQ(e.errorId(), "GenericException");
    }
    EXPECT_EQ(buf.sgetc(), '2');
}
