#include <boost/make_shared.hpp>
#include <climits>
#include <cstring>

#include "IoTest.h"
#include "io/ByteArrayInputStream.h"
#include "io/ByteArrayOutputStream.h"
#include "io/Exception.h"
#include "io/FileInputStream.h"
#include "io/FileOutputStream.h"
#include "io/WrappedInputStream.h"

namespace {

class StreamTest : public IoTest {};

}  // namespace

TEST_F(StreamTest, FixedWidthValuesAreWrittenLittleEndian) {
    IO::ByteArrayOutputStream out;
    out.writeBool(true);
    out.writeUByte(0xAB);
    out.writeByte(-2);
    out.writeShort(0x1234);
    out.writeInt(-2);
    out.writeLongLong(0x0102030405060708LL);
    out.writeULongLong(0xF0E0D0C0B0A09080ULL);
    out.writeFloat(1.0f);
    Bytes expected = {1, 0xAB, 0xFE, 0x34, 0x12, 0xFE, 0xFF, 0xFF, 0xFF, 8,    7,    6,    5,    4,   3,
                      2, 1,    0x80, 0x90, 0xA0, 0xB0, 0xC0, 0xD0, 0xE0, 0xF0, 0x00, 0x00, 0x80, 0x3F};
    EXPECT_EQ(expected, out.getData());
}

TEST_F(StreamTest, EveryEncodedTypeRoundTrips) {
    IO::ByteArrayOutputStream out;
    out.writeBool(false);
    out.writeBool(true);
    out.writeUByte(255);
    out.writeByte(-128);
    out.writeShort(-32768);
    out.writeInt(INT_MIN);
    out.writeLongLong(LLONG_MIN);
    out.writeULongLong(ULLONG_MAX);
    out.writeFloat(-3.25e-7f);
    out.writeString("Zürich");
    out.writeNString(std::string(255, 'n'));
    out.writeZString("zero");
    out.writeString("");

    IO::ByteArrayInputStream in(out.getData().data(), static_cast<int>(out.getData().size()));
    EXPECT_FALSE(in.readBool());
    EXPECT_TRUE(in.readBool());
    EXPECT_EQ(255, in.readUByte());
    EXPECT_EQ(-128, in.readByte());
    EXPECT_EQ(-32768, in.readShort());
    EXPECT_EQ(INT_MIN, in.readInt());
    EXPECT_EQ(LLONG_MIN, in.readLongLong());
    EXPECT_EQ(ULLONG_MAX, in.readULongLong());
    EXPECT_EQ(-3.25e-7f, in.readFloat());
    std::string text;
    EXPECT_TRUE(in.readString(text));
    EXPECT_EQ("Zürich", text);
    EXPECT_TRUE(in.readNString(text));
    EXPECT_EQ(std::string(255, 'n'), text);
    EXPECT_TRUE(in.readZString(text));
    EXPECT_EQ("zero", text);
    EXPECT_TRUE(in.readString(text));
    EXPECT_EQ("", text);
    EXPECT_EQ(0, in.available());
}

TEST_F(StreamTest, EmptyStringsHaveTheirMinimalEncodings) {
    IO::ByteArrayOutputStream zero;
    zero.writeZString("");
    EXPECT_EQ(Bytes(1, 0), zero.getData());
    IO::ByteArrayOutputStream counted;
    counted.writeString("");
    EXPECT_EQ(Bytes(4, 0), counted.getData());
}

TEST_F(StreamTest, AnNStringLongerThanItsLengthByteIsCutSoTheDataStaysReadable) {
    IO::ByteArrayOutputStream out;
    out.writeNString(std::string(300, 'x'));
    out.writeInt(42);
    expectAssertion("value.size() <= 255");

    IO::ByteArrayInputStream in(out.getData().data(), static_cast<int>(out.getData().size()));
    std::string text;
    EXPECT_TRUE(in.readNString(text));
    EXPECT_EQ(std::string(255, 'x'), text);
    EXPECT_EQ(42, in.readInt());
}

TEST_F(StreamTest, ReadStringWithThreeBytesLeftLeavesTheStringUntouched) {
    Bytes data = {1, 0, 0};
    IO::ByteArrayInputStream in(data.data(), 3);
    std::string text = "kept";
    EXPECT_FALSE(in.readString(text));
    EXPECT_EQ("kept", text);
    EXPECT_EQ(0, in.tell());
}

TEST_F(StreamTest, ReadStringOfLengthZeroOrNegativeIsEmpty) {
    Bytes data = {0, 0, 0, 0, 0xFF, 0xFF, 0xFF, 0xFF};
    IO::ByteArrayInputStream in(data.data(), 8);
    std::string text = "old";
    EXPECT_TRUE(in.readString(text));
    EXPECT_EQ("", text);
    text = "old";
    EXPECT_TRUE(in.readString(text));
    EXPECT_EQ("", text);
}

TEST_F(StreamTest, ReadStringWithACorruptLengthFailsWithoutTouchingMemoryPastTheData) {
    Bytes data = {0xFF, 0xFF, 0xFF, 0x7F, 'a', 'b'};
    IO::ByteArrayInputStream in(data.data(), 6);
    std::string text = "old";
    EXPECT_FALSE(in.readString(text));
    EXPECT_EQ("", text);
    expectAssertion("false");

    IO::ByteArrayInputStream strict(data.data(), 6);
    strict.enableExceptions();
    EXPECT_THROW(strict.readString(text), IO::Exception);
}

TEST_F(StreamTest, ReadStringWithMissingBytesFails) {
    Bytes data = {5, 0, 0, 0, 'a', 'b'};
    IO::ByteArrayInputStream in(data.data(), 6);
    std::string text;
    EXPECT_FALSE(in.readString(text));
    EXPECT_EQ("", text);
    expectAssertion("false");
}

TEST_F(StreamTest, ReadNStringNeedsAByteAndItsBytes) {
    IO::ByteArrayInputStream empty(nullptr, 0);
    std::string text = "kept";
    EXPECT_FALSE(empty.readNString(text));
    EXPECT_EQ("kept", text);

    Bytes zero = {0};
    IO::ByteArrayInputStream none(zero.data(), 1);
    EXPECT_TRUE(none.readNString(text));
    EXPECT_EQ("", text);

    Bytes shortData = {3, 'a'};
    IO::ByteArrayInputStream cut(shortData.data(), 2);
    EXPECT_FALSE(cut.readNString(text));
    expectAssertion("false");
}

TEST_F(StreamTest, ReadCRLFStringDropsCarriageReturnsAndEndsAtTheData) {
    Bytes data = bytesOf("ab\r\ncd");
    IO::ByteArrayInputStream in(data.data(), static_cast<int>(data.size()));
    std::string line;
    EXPECT_TRUE(in.readCRLFString(line));
    EXPECT_EQ("ab", line);
    EXPECT_TRUE(in.readCRLFString(line));
    EXPECT_EQ("cd", line);
    EXPECT_FALSE(in.readCRLFString(line));
    EXPECT_EQ("cd", line);
}

TEST_F(StreamTest, ReadCRLFStringReadsEmptyLinesAndInnerCarriageReturns) {
    Bytes data = bytesOf("\na\rb\r\n");
    IO::ByteArrayInputStream in(data.data(), static_cast<int>(data.size()));
    std::string line = "x";
    EXPECT_TRUE(in.readCRLFString(line));
    EXPECT_EQ("", line);
    EXPECT_TRUE(in.readCRLFString(line));
    EXPECT_EQ("ab", line);
    EXPECT_EQ(0, in.available());
}

TEST_F(StreamTest, ReadZStringStopsAtTheZeroByte) {
    Bytes data = {'h', 'i', 0, 'x', 0};
    IO::ByteArrayInputStream in(data.data(), 5);
    std::string text;
    EXPECT_TRUE(in.readZString(text));
    EXPECT_EQ("hi", text);
    EXPECT_TRUE(in.readZString(text));
    EXPECT_EQ("x", text);
    EXPECT_FALSE(in.readZString(text));
}

TEST_F(StreamTest, AnUnterminatedZStringIsABadStateNotAnEndlessLoop) {
    Bytes data = {'h', 'i'};
    IO::ByteArrayInputStream in(data.data(), 2);
    std::string text;
    EXPECT_TRUE(in.readZString(text));
    EXPECT_EQ("hi", text);
    expectAssertion("false");

    IO::ByteArrayInputStream strict(data.data(), 2);
    strict.enableExceptions();
    EXPECT_THROW(strict.readZString(text), IO::Exception);
}

TEST_F(StreamTest, AShortMemoryReadZeroFillsReportsAndDoesNotMove) {
    Bytes data = {1, 2, 3};
    IO::ByteArrayInputStream in(data.data(), 3);
    in.seek(1, KD_SEEK_SET);
    unsigned char buffer[5];
    std::memset(buffer, 0xEE, sizeof(buffer));
    EXPECT_EQ(0, in.read(buffer, 5));
    EXPECT_EQ(Bytes(5, 0), Bytes(buffer, buffer + 5));
    EXPECT_EQ(1, in.tell());
    expectAssertion("false");
    EXPECT_EQ(2, in.readUByte());
}

TEST_F(StreamTest, AShortFixedWidthReadYieldsZero) {
    Bytes data = {0x11, 0x22};
    IO::ByteArrayInputStream in(data.data(), 2);
    EXPECT_EQ(0, in.readInt());
    expectAssertion("false");
    EXPECT_EQ(0x2211, in.readShort());
}

TEST_F(StreamTest, ExceptionsReplaceTheAssertionOnlyWhenEnabled) {
    Bytes data = {1};
    IO::ByteArrayInputStream in(data.data(), 1);
    in.enableExceptions();
    EXPECT_TRUE(hasLogLine("Enabling exceptions for stream"));
    EXPECT_THROW(in.readInt(), IO::Exception);
    EXPECT_TRUE(assertions().empty());
    EXPECT_EQ(0, in.tell());
}

TEST_F(StreamTest, SeekingAMemoryStreamIsClampedToItsData) {
    Bytes data = {10, 11, 12, 13};
    IO::ByteArrayInputStream in(data.data(), 4);
    in.seek(-5, KD_SEEK_SET);
    EXPECT_EQ(0, in.tell());
    EXPECT_EQ(10, in.readUByte());
    in.seek(100, KD_SEEK_CUR);
    EXPECT_EQ(4, in.tell());
    EXPECT_EQ(0, in.available());
    in.seek(-2, KD_SEEK_END);
    EXPECT_EQ(12, in.readUByte());
    in.seek(1LL << 40, KD_SEEK_SET);
    EXPECT_EQ(4, in.tell());
    unsigned char byte = 0xEE;
    EXPECT_EQ(0, in.read(&byte, 1));
    EXPECT_EQ(0, byte);
    expectAssertion("false");
}

TEST_F(StreamTest, AnOutputStreamMadeWithASizeStartsWithThatManyZeros) {
    IO::ByteArrayOutputStream out(3);
    out.writeUByte(7);
    EXPECT_EQ((Bytes{0, 0, 0, 7}), out.getData());
}

TEST_F(StreamTest, FileStreamsCreateFoldersAndReadBackWhatWasWritten) {
    Bytes data = pattern(5000);
    writeFile("/data/a/b/c.bin", data);

    IO::FileInputStream in;
    ASSERT_TRUE(in.init("/data/a/b/c.bin"));
    EXPECT_EQ(5000, in.available());
    EXPECT_EQ(data, readAll(in));
    in.seek(-10, KD_SEEK_END);
    EXPECT_EQ(4990, in.tell());
    EXPECT_EQ(10, in.available());
    EXPECT_EQ(data[4990], in.readUByte());
}

TEST_F(StreamTest, OpeningAMissingFileFails) {
    IO::FileInputStream in;
    EXPECT_FALSE(in.init("/data/missing"));
}

TEST_F(StreamTest, AShortFileReadZeroFillsTheWholeBufferAndReturnsTheCount) {
    writeFile("/data/f", bytesOf("abc"));
    IO::FileInputStream in;
    ASSERT_TRUE(in.init("/data/f"));
    in.seek(1, KD_SEEK_SET);
    char buffer[4] = {'x', 'x', 'x', 'x'};
    EXPECT_EQ(2, in.read(buffer, 4));
    EXPECT_EQ(std::string(4, '\0'), std::string(buffer, 4));
    expectAssertion("false");

    IO::FileInputStream strict;
    ASSERT_TRUE(strict.init("/data/f"));
    strict.enableExceptions();
    EXPECT_THROW(strict.readLongLong(), IO::Exception);
}

TEST_F(StreamTest, AWindowReadsItsBytesAndRestoresTheInnerPosition) {
    Bytes data = pattern(30);
    boost::shared_ptr<IO::InputStream> inner = boost::make_shared<IO::ByteArrayInputStream>(data.data(), 30);
    inner->seek(3, KD_SEEK_SET);
    {
        IO::WrappedInputStream window(inner, 10, 10);
        EXPECT_EQ(10, window.available());
        EXPECT_EQ(0, window.tell());
        EXPECT_EQ(data[10], window.readUByte());
        window.seek(-1, KD_SEEK_END);
        EXPECT_EQ(data[19], window.readUByte());
        window.seek(2, KD_SEEK_SET);
        window.seek(3, KD_SEEK_CUR);
        EXPECT_EQ(data[15], window.readUByte());
    }
    EXPECT_EQ(3, inner->tell());
}

TEST_F(StreamTest, AWindowNeverReadsOutsideItself) {
    Bytes data = pattern(30);
    boost::shared_ptr<IO::InputStream> inner = boost::make_shared<IO::ByteArrayInputStream>(data.data(), 30);
    IO::WrappedInputStream window(inner, 10, 10);
    window.seek(-4, KD_SEEK_SET);
    EXPECT_EQ(0, window.tell());
    window.seek(6, KD_SEEK_SET);
    unsigned char buffer[8] = {};
    EXPECT_EQ(4, window.read(buffer, 8));
    expectAssertion("available() >= len");
    EXPECT_EQ(Bytes(data.begin() + 16, data.begin() + 20), Bytes(buffer, buffer + 4));
    window.seek(50, KD_SEEK_SET);
    EXPECT_EQ(10, window.tell());
    EXPECT_EQ(0, window.available());
}

TEST_F(StreamTest, AWindowReadsItsOwnBytesAfterSomeoneElseMovedTheInnerStream) {
    Bytes data = pattern(30);
    boost::shared_ptr<IO::InputStream> inner = boost::make_shared<IO::ByteArrayInputStream>(data.data(), 30);
    IO::WrappedInputStream first(inner, 0, 10);
    IO::WrappedInputStream second(inner, 20, 10);
    EXPECT_EQ(data[0], first.readUByte());
    EXPECT_EQ(data[20], second.readUByte());
    inner->seek(27, KD_SEEK_SET);
    EXPECT_EQ(data[1], first.readUByte());
    EXPECT_EQ(data[21], second.readUByte());
}

namespace {

// Claims data but fails every read, as a damaged inflating entry does.
class FailingStream : public IO::InputStream {
public:
    long long available() override { return 100; }
    int read(void*, int) override { return -1; }
    long long tell() override { return 0; }
    void seek(long long, KDfileSeekOrigin) override {}
};

}  // namespace

TEST_F(StreamTest, LineAndZeroTerminatedReadersEndOnAFailingStream) {
    FailingStream stream;
    std::string text = "x";
    EXPECT_TRUE(stream.readCRLFString(text));
    EXPECT_EQ("", text);
    EXPECT_TRUE(stream.readZString(text));
    EXPECT_EQ("", text);
    EXPECT_EQ(0, stream.readInt());
}
