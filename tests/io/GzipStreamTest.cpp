#include <zlib.h>

#include "IoTest.h"
#include "io/ByteArrayInputStream.h"
#include "io/ByteArrayOutputStream.h"
#include "io/Exception.h"
#include "io/zip/GzipInputStream.h"
#include "io/zip/GzipOutputStream.h"

namespace {

class GzipStreamTest : public IoTest {
protected:
    static Bytes gzip(const Bytes& data) {
        IO::ByteArrayOutputStream out;
        {
            IO::Zip::GzipOutputStream zipped(&out);
            if (!data.empty()) {
                zipped.write(data.data(), static_cast<int>(data.size()));
            }
        }
        return out.getData();
    }

    static Bytes gunzip(const Bytes& compressed) {
        IO::ByteArrayInputStream in(compressed.data(), static_cast<int>(compressed.size()));
        IO::Zip::GzipInputStream unzipped(&in);
        return readAll(unzipped);
    }

    // Independent of our streams: zlib's own one-shot compression with the zlib header.
    static Bytes zlibCompress(const Bytes& data) {
        uLongf size = compressBound(data.size());
        Bytes out(size);
        compress(out.data(), &size, data.data(), data.size());
        out.resize(size);
        return out;
    }

    // Also independent of our streams: zlib deflating straight into the gzip format.
    static Bytes zlibGzip(const Bytes& data, int level = Z_DEFAULT_COMPRESSION) {
        z_stream zs = {};
        deflateInit2(&zs, level, Z_DEFLATED, 31, 8, Z_DEFAULT_STRATEGY);
        Bytes out(deflateBound(&zs, data.size()));
        zs.next_in = const_cast<Bytef*>(data.data());
        zs.avail_in = static_cast<uInt>(data.size());
        zs.next_out = out.data();
        zs.avail_out = static_cast<uInt>(out.size());
        deflate(&zs, Z_FINISH);
        out.resize(zs.total_out);
        deflateEnd(&zs);
        return out;
    }
};

}  // namespace

TEST_F(GzipStreamTest, WhatIsWrittenReadsBackIdenticallyAtEverySize) {
    for (size_t size : {size_t(0), size_t(1), size_t(4095), size_t(4096), size_t(100000)}) {
        const Bytes data = pattern(size, static_cast<unsigned int>(size));
        const Bytes compressed = gzip(data);
        EXPECT_GE(compressed.size(), 18u) << size;
        EXPECT_EQ(data, gunzip(compressed)) << size;
    }
    // Highly compressible content grows the inflated output as needed.
    const Bytes repeated(3000000, 'a');
    const Bytes compressed = gzip(repeated);
    EXPECT_LT(compressed.size(), 10000u);
    EXPECT_EQ(repeated, gunzip(compressed));
}

TEST_F(GzipStreamTest, OutputIsAGzipStreamThatZlibReads) {
    const Bytes data = pattern(20000);
    const Bytes compressed = gzip(data);
    ASSERT_GE(compressed.size(), 18u);
    EXPECT_EQ(0x1f, compressed[0]);
    EXPECT_EQ(0x8b, compressed[1]);

    z_stream zs = {};
    ASSERT_EQ(Z_OK, inflateInit2(&zs, 31));
    Bytes out(data.size() + 1);
    zs.next_in = const_cast<Bytef*>(compressed.data());
    zs.avail_in = static_cast<uInt>(compressed.size());
    zs.next_out = out.data();
    zs.avail_out = static_cast<uInt>(out.size());
    EXPECT_EQ(Z_STREAM_END, inflate(&zs, Z_FINISH));
    out.resize(zs.total_out);
    inflateEnd(&zs);
    EXPECT_EQ(data, out);
}

TEST_F(GzipStreamTest, NothingReachesTheOutputBeforeTheStreamIsDestroyed) {
    IO::ByteArrayOutputStream out;
    {
        IO::Zip::GzipOutputStream zipped(&out);
        EXPECT_EQ(5, zipped.write("hello", 5));
        EXPECT_TRUE(out.getData().empty());
    }
    EXPECT_EQ(bytesOf("hello"), gunzip(out.getData()));
}

TEST_F(GzipStreamTest, ZlibWrappedInputIsInflatedAndPlainBytesPassThrough) {
    const Bytes data = pattern(5000);
    EXPECT_EQ(data, gunzip(zlibCompress(data)));
    const Bytes plain = bytesOf("<xml>not compressed</xml>");
    EXPECT_EQ(plain, gunzip(plain));
    EXPECT_TRUE(logLines().empty());
}

TEST_F(GzipStreamTest, EmptyInputLogsTheBufferErrorAndHasNoContent) {
    IO::ByteArrayInputStream in(nullptr, 0);
    IO::Zip::GzipInputStream unzipped(&in);
    EXPECT_TRUE(hasLogLine("GzipInputStream::read error -5"));
    EXPECT_EQ(0, unzipped.available());
    EXPECT_EQ(-1, unzipped.tell());
    unsigned char byte;
    EXPECT_EQ(-1, unzipped.read(&byte, 1));
    unzipped.seek(0, KD_SEEK_SET);
    std::string text = "kept";
    EXPECT_FALSE(unzipped.readString(text));
    EXPECT_EQ("kept", text);
}

TEST_F(GzipStreamTest, ATruncatedStreamIsEmptyAtEveryCut) {
    Bytes compressed = gzip(pattern(3000));
    for (size_t cut = 1; cut < compressed.size(); cut += 7) {
        EXPECT_EQ(Bytes(), gunzip(slice(compressed, 0, cut))) << cut;
    }
    EXPECT_GT(countLogLines("GzipInputStream::read error -5"), 0);
}

TEST_F(GzipStreamTest, ACorruptStreamIsEmptyOrWholeButNeverGarbled) {
    Bytes data = pattern(3000);
    Bytes compressed = gzip(data);
    for (size_t at = 0; at < compressed.size(); at += 5) {
        Bytes corrupt = compressed;
        corrupt[at] ^= 0x5A;
        Bytes result = gunzip(corrupt);
        // Only without its gzip magic is the input plain content.
        EXPECT_TRUE(result.empty() || result == data || (at < 2 && result == corrupt)) << at;
    }
}

TEST_F(GzipStreamTest, DamagedCompressedDataFailsInsteadOfPassingThrough) {
    const Bytes data = pattern(20000);
    const Bytes gzipped = zlibGzip(data);
    const Bytes zlibbed = zlibCompress(data);
    auto damaged = [](Bytes bytes, size_t at, unsigned char value) {
        bytes[at] = value;
        return bytes;
    };
    const Bytes cases[] = {
        damaged(gzipped, gzipped.size() - 8,
                static_cast<unsigned char>(~gzipped[gzipped.size() - 8])),  // CRC
        damaged(gzipped, gzipped.size() - 1, 0xff),                         // size
        damaged(gzipped, gzipped.size() / 2,
                static_cast<unsigned char>(~gzipped[gzipped.size() / 2])),  // block
        damaged(gzipped, 10, 0xff),                                         // block type
        damaged(zlibbed, zlibbed.size() - 1, 0x00),                         // Adler-32
        damaged(zlibbed, zlibbed.size() / 2, static_cast<unsigned char>(~zlibbed[zlibbed.size() / 2])),
    };
    for (const Bytes& input : cases) {
        clearLog();
        IO::ByteArrayInputStream in(input.data(), static_cast<int>(input.size()));
        IO::Zip::GzipInputStream unzipped(&in);
        EXPECT_EQ(0, unzipped.available());
        unsigned char byte;
        EXPECT_EQ(-1, unzipped.read(&byte, 1));
        EXPECT_TRUE(hasLogLine("GzipInputStream::read error -3"));
        unzipped.enableExceptions();
        EXPECT_THROW(unzipped.readInt(), IO::Exception);
    }
}

// Made by Python's zlib.compress(b"hello", 6) and gzip.compress(b"hello", mtime=0).
const std::vector<unsigned char> kPythonZlibHello = {0x78, 0x9c, 0xcb, 0x48, 0xcd, 0xc9, 0xc9,
                                                     0x07, 0x00, 0x06, 0x2c, 0x02, 0x15};
const std::vector<unsigned char> kPythonGzipHello = {0x1f, 0x8b, 0x08, 0x00, 0x00, 0x00, 0x00, 0x00, 0x02,
                                                     0x03, 0xcb, 0x48, 0xcd, 0xc9, 0xc9, 0x07, 0x00, 0x86,
                                                     0xa6, 0x10, 0x36, 0x05, 0x00, 0x00, 0x00};

TEST_F(GzipStreamTest, StreamsFromPythonCutAnywhereFailEvenAtTheirFirstByte) {
    for (const Bytes& whole : {kPythonZlibHello, kPythonGzipHello}) {
        EXPECT_EQ(bytesOf("hello"), gunzip(whole));
        for (size_t cut = 1; cut < whole.size(); ++cut) {
            clearLog();
            IO::ByteArrayInputStream in(whole.data(), static_cast<int>(cut));
            IO::Zip::GzipInputStream unzipped(&in);
            EXPECT_EQ(0, unzipped.available()) << whole[0] << " cut at " << cut;
            EXPECT_TRUE(hasLogLine("GzipInputStream::read error -5")) << whole[0] << " cut at " << cut;
        }
    }
}

TEST_F(GzipStreamTest, TextThatBeginsLikeAZlibHeaderPassesThroughButDamagedZlibDataFails) {
    // Each begins with two characters that pass the zlib header check.
    for (const char* text : {"x^2 + y^2 = r^2", "80 km/h", "hb", "x^",
                             "HK\n\tstra\xc3\x9f"
                             "e"}) {
        EXPECT_EQ(bytesOf(text), gunzip(bytesOf(text))) << text;
    }
    EXPECT_TRUE(logLines().empty());

    // Python's zlib.compress(..., 3) begins with the same "x^".
    const Bytes levelThree = {0x78, 0x5e, 0xab, 0x88, 0x33, 0x52, 0xd0, 0x56, 0xa8, 0x04, 0x92, 0xb6,
                              0x0a, 0x45, 0x40, 0x32, 0x23, 0x3f, 0x27, 0xa5, 0x58, 0x21, 0x3f, 0x4f,
                              0x21, 0xb5, 0x2c, 0xb5, 0xa8, 0x52, 0xa1, 0x20, 0x3f, 0x33, 0xaf, 0x44,
                              0x21, 0x3f, 0x4d, 0xa1, 0x24, 0x23, 0x55, 0x21, 0x39, 0xb3, 0x28, 0x39,
                              0x27, 0x95, 0x0b, 0x00, 0x9e, 0x5e, 0x10, 0xba};
    EXPECT_EQ(bytesOf("x^2 + y^2 = r^2 holds on every point of the circle\n"), gunzip(levelThree));
    for (size_t at = 2; at < levelThree.size(); ++at) {
        Bytes damaged = levelThree;
        damaged[at] ^= 0x01;
        EXPECT_EQ(Bytes(), gunzip(damaged)) << at;
    }
}

TEST_F(GzipStreamTest, ContentBeyondTheLimitStopsWithAnErrorAndAnImplausibleTrailerIsNotTrusted) {
    // One zero byte past the limit, deflated a MiB at a time.
    const Bytes mebibyte(1 << 20, 0);
    Bytes bomb(1 << 21);
    z_stream zs = {};
    deflateInit2(&zs, Z_BEST_SPEED, Z_DEFLATED, 31, 8, Z_DEFAULT_STRATEGY);
    zs.next_out = bomb.data();
    zs.avail_out = static_cast<uInt>(bomb.size());
    for (int i = 0; i <= IO::Zip::GzipInputStream::kMaxInflatedSize >> 20; ++i) {
        zs.next_in = const_cast<Bytef*>(mebibyte.data());
        zs.avail_in = i < IO::Zip::GzipInputStream::kMaxInflatedSize >> 20 ? 1 << 20 : 1;
        deflate(&zs, Z_NO_FLUSH);
    }
    deflate(&zs, Z_FINISH);
    bomb.resize(zs.total_out);
    deflateEnd(&zs);
    EXPECT_EQ(Bytes(), gunzip(bomb));
    EXPECT_TRUE(hasLogLine("GzipInputStream: content larger than 67108864 bytes"));

    // Two members: the trailer at the end is the second's, shorter than the content read.
    const Bytes first = pattern(5000, 1);
    Bytes twoMembers = zlibGzip(first);
    const Bytes second = zlibGzip(pattern(10, 2));
    twoMembers.insert(twoMembers.end(), second.begin(), second.end());
    EXPECT_EQ(first, gunzip(twoMembers));
}

TEST_F(GzipStreamTest, InflatesWhatTheInputHasLeftAndPassesExceptionsOnToTheContent) {
    const Bytes compressed = gzip(bytesOf("ab"));
    Bytes framed = bytesOf("head");
    framed.insert(framed.end(), compressed.begin(), compressed.end());
    IO::ByteArrayInputStream in(framed.data(), static_cast<int>(framed.size()));
    in.seek(4, KD_SEEK_SET);
    IO::Zip::GzipInputStream unzipped(&in);
    EXPECT_EQ(0, in.available());
    unzipped.enableExceptions();
    EXPECT_EQ('a', unzipped.readUByte());
    EXPECT_THROW(unzipped.readInt(), IO::Exception);
    EXPECT_EQ('b', unzipped.readUByte());
}
