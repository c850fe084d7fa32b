#include <boost/make_shared.hpp>
#include <cstring>

#include "IoTest.h"
#include "io/ByteArrayInputStream.h"
#include "io/ByteArrayOutputStream.h"
#include "io/Exception.h"
#include "io/FileInputStream.h"
#include "io/FileOutputStream.h"
#include "io/WrappedInputStream.h"

namespace {

class StreamTest : public IoTest {
protected:
    static IO::ByteArrayInputStream memory(const Bytes& data) {
        return IO::ByteArrayInputStream(data.data(), static_cast<int>(data.size()));
    }
};

typedef bool (IO::InputStream::*StringReader)(std::string&);

// Claims data but fails every read, as a damaged inflating entry does.
class FailingStream : public IO::InputStream {
public:
    long long available() override { return 100; }
    int read(void*, int) override { return -1; }
    long long tell() override { return 0; }
    void seek(long long, KDfileSeekOrigin) override {}
};

}  // namespace

TEST_F(StreamTest, ValuesAreEncodedLittleEndianAfterThePresetZerosAndReadBack) {
    IO::ByteArrayOutputStream out(3);
    out.writeBool(true);
    out.writeUByte(0xAB);
    out.writeByte(-2);
    out.writeShort(-32768);
    out.writeInt(-2);
    out.writeLongLong(0x0102030405060708LL);
    out.writeULongLong(0xF0E0D0C0B0A09080ULL);
    out.writeFloat(1.0f);
    out.writeZString("");
    out.writeString("");
    const Bytes expected = {0,    0,    0,    1,    0xAB, 0xFE, 0x00, 0x80, 0xFE, 0xFF, 0xFF, 0xFF, 8,
                            7,    6,    5,    4,    3,    2,    1,    0x80, 0x90, 0xA0, 0xB0, 0xC0, 0xD0,
                            0xE0, 0xF0, 0x00, 0x00, 0x80, 0x3F, 0,    0,    0,    0,    0};
    EXPECT_EQ(expected, out.getData());
    out.writeString("Zürich");
    out.writeNString(std::string(255, 'n'));
    out.writeZString("zero");

    IO::ByteArrayInputStream in = memory(out.getData());
    in.seek(3, KD_SEEK_SET);
    EXPECT_TRUE(in.readBool());
    EXPECT_EQ(0xAB, in.readUByte());
    EXPECT_EQ(-2, in.readByte());
    EXPECT_EQ(-32768, in.readShort());
    EXPECT_EQ(-2, in.readInt());
    EXPECT_EQ(0x0102030405060708LL, in.readLongLong());
    EXPECT_EQ(0xF0E0D0C0B0A09080ULL, in.readULongLong());
    EXPECT_EQ(1.0f, in.readFloat());
    std::string text = "old";
    EXPECT_TRUE(in.readZString(text) && text.empty());
    text = "old";
    EXPECT_TRUE(in.readString(text) && text.empty());
    EXPECT_TRUE(in.readString(text) && text == "Zürich");
    EXPECT_TRUE(in.readNString(text) && text == std::string(255, 'n'));
    EXPECT_TRUE(in.readZString(text) && text == "zero");
    EXPECT_EQ(0, in.available());
}

TEST_F(StreamTest, AnNStringLongerThanItsLengthByteIsCutSoTheDataStaysReadable) {
    IO::ByteArrayOutputStream out;
    out.writeNString(std::string(300, 'x'));
    out.writeInt(42);
    expectAssertion("value.size() <= 255");

    IO::ByteArrayInputStream in = memory(out.getData());
    std::string text;
    EXPECT_TRUE(in.readNString(text));
    EXPECT_EQ(std::string(255, 'x'), text);
    EXPECT_EQ(42, in.readInt());
}

TEST_F(StreamTest, StringReadersHandleEmptyShortAndCorruptData) {
    const StringReader counted = &IO::InputStream::readString;
    const StringReader shortCounted = &IO::InputStream::readNString;
    const StringReader line = &IO::InputStream::readCRLFString;
    const StringReader zero = &IO::InputStream::readZString;
    const struct {
        const char* label;
        StringReader reader;
        Bytes data;
        std::vector<std::string> strings;  // what successive reads deliver
        std::string after;                 // the string once reading fails
        int assertions;
    } cases[] = {
        {"string with three bytes left", counted, {1, 0, 0}, {}, "old", 0},
        {"string of length zero or negative", counted, {0, 0, 0, 0, 0xFF, 0xFF, 0xFF, 0xFF}, {"", ""}, "", 0},
        // A huge length is refused before anything is allocated or read.
        {"string with a corrupt length", counted, {0xFF, 0xFF, 0xFF, 0x7F, 'a', 'b'}, {}, "", 1},
        {"string with missing bytes", counted, {5, 0, 0, 0, 'a', 'b'}, {}, "", 1},
        {"nstring without data", shortCounted, {}, {}, "old", 0},
        {"nstring of length zero", shortCounted, {0}, {""}, "", 0},
        {"nstring with missing bytes", shortCounted, {3, 'a'}, {}, "", 1},
        {"lines", line, bytesOf("ab\r\ncd"), {"ab", "cd"}, "cd", 0},
        {"empty line, inner carriage return", line, bytesOf("\na\rb\r\n"), {"", "ab"}, "ab", 0},
        {"zero-terminated strings", zero, {'h', 'i', 0, 'x', 0}, {"hi", "x"}, "x", 0},
        // The end of the data is a bad state, not an endless loop.
        {"unterminated zero-terminated string", zero, {'h', 'i'}, {"hi"}, "hi", 1},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.label);
        IO::ByteArrayInputStream in = memory(c.data);
        std::vector<std::string> strings;
        std::string text = "old";
        while (strings.size() < 5 && (in.*c.reader)(text)) {
            strings.push_back(text);
        }
        EXPECT_EQ(c.strings, strings);
        EXPECT_EQ(c.after, text);
        EXPECT_EQ(c.assertions, claimAssertions());
    }
}

TEST_F(StreamTest, AShortMemoryReadZeroFillsReportsAndDoesNotMove) {
    const Bytes data = {1, 2, 3};
    IO::ByteArrayInputStream in = memory(data);
    in.seek(1, KD_SEEK_SET);
    unsigned char buffer[5];
    std::memset(buffer, 0xEE, sizeof(buffer));
    EXPECT_EQ(0, in.read(buffer, 5));
    EXPECT_EQ(Bytes(5, 0), Bytes(buffer, buffer + 5));
    EXPECT_EQ(1, in.tell());
    expectAssertion("false");
    EXPECT_EQ(0, in.readInt());
    expectAssertion("false");
    EXPECT_EQ(0x0302, in.readShort());
}

TEST_F(StreamTest, BadStatesThrowInsteadOfAssertingOnceExceptionsAreEnabled) {
    writeFile("/data/f", bytesOf("abc"));
    IO::FileInputStream file;
    ASSERT_TRUE(file.init("/data/f"));
    const Bytes corruptLength = {0xFF, 0xFF, 0xFF, 0x7F, 'a', 'b'};
    const Bytes unterminated = {'h', 'i'};
    IO::ByteArrayInputStream string = memory(corruptLength);
    IO::ByteArrayInputStream zString = memory(unterminated);
    file.enableExceptions();
    string.enableExceptions();
    zString.enableExceptions();
    EXPECT_TRUE(hasLogLine("Enabling exceptions for stream"));
    std::string text;
    EXPECT_THROW(file.readLongLong(), IO::Exception);
    EXPECT_THROW(string.readString(text), IO::Exception);
    EXPECT_THROW(zString.readZString(text), IO::Exception);
    EXPECT_TRUE(assertions().empty());
}

TEST_F(StreamTest, SeekingAMemoryStreamIsClampedToItsData) {
    const Bytes data = {10, 11, 12, 13};
    IO::ByteArrayInputStream in = memory(data);
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
}

TEST_F(StreamTest, FileStreamsCreateFoldersReadBackAndZeroFillAShortRead) {
    const Bytes data = pattern(5000);
    writeFile("/data/a/b/c.bin", data);
    IO::FileInputStream in;
    ASSERT_TRUE(in.init("/data/a/b/c.bin"));
    EXPECT_EQ(5000, in.available());
    EXPECT_EQ(data, readAll(in));
    in.seek(-10, KD_SEEK_END);
    EXPECT_EQ(4990, in.tell());
    EXPECT_EQ(data[4990], in.readUByte());
    Bytes buffer(20, 0xEE);
    EXPECT_EQ(9, in.read(buffer.data(), 20));
    EXPECT_EQ(Bytes(20, 0), buffer);
    expectAssertion("false");
    IO::FileInputStream missing;
    EXPECT_FALSE(missing.init("/data/missing"));
}

TEST_F(StreamTest, AWindowReadsOnlyItsBytesWhereverOthersMoveTheInnerStream) {
    const Bytes data = pattern(30);
    boost::shared_ptr<IO::InputStream> inner = boost::make_shared<IO::ByteArrayInputStream>(data.data(), 30);
    inner->seek(3, KD_SEEK_SET);
    {
        IO::WrappedInputStream window(inner, 10, 10);
        EXPECT_EQ(10, window.available());
        EXPECT_EQ(data[10], window.readUByte());
        inner->seek(27, KD_SEEK_SET);
        EXPECT_EQ(data[11], window.readUByte());
        window.seek(-1, KD_SEEK_END);
        EXPECT_EQ(data[19], window.readUByte());
        window.seek(2, KD_SEEK_SET);
        window.seek(3, KD_SEEK_CUR);
        EXPECT_EQ(data[15], window.readUByte());
        window.seek(-4, KD_SEEK_SET);
        EXPECT_EQ(0, window.tell());
        window.seek(6, KD_SEEK_SET);
        unsigned char buffer[8];
        std::memset(buffer, 0xff, sizeof(buffer));
        EXPECT_EQ(4, window.read(buffer, 8));
        expectAssertion("false");
        EXPECT_EQ(slice(data, 16, 4), Bytes(buffer, buffer + 4));
        EXPECT_EQ(Bytes(4, 0), Bytes(buffer + 4, buffer + 8));
        window.seek(50, KD_SEEK_SET);
        EXPECT_EQ(10, window.tell());
    }
    EXPECT_EQ(3, inner->tell());
}

TEST_F(StreamTest, LineAndZeroTerminatedReadersEndOnAFailingStream) {
    FailingStream stream;
    std::string text = "x";
    EXPECT_TRUE(stream.readCRLFString(text));
    EXPECT_EQ("", text);
    EXPECT_TRUE(stream.readZString(text));
    EXPECT_EQ("", text);
    EXPECT_EQ(0, stream.readInt());
}
