// Decoding checked against images written by other encoders (Python's zlib
// for PNG, cjpeg for JPEG; see data/make_images.py), and against input that
// is damaged, truncated or too large.
#include <pal/Simulation.h>
#include <sys/resource.h>

#include <boost/make_shared.hpp>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include "image/Image.h"
#include "io/ByteArrayInputStream.h"
#include "io/FileManager.h"
#include "io/FileOutputStream.h"
#include "io/resource/PackageBuilder.h"
#include "math/Color.h"
#include "support/PalTest.h"

namespace {

typedef std::vector<unsigned char> Bytes;

Bytes readData(const std::string& name) {
    std::ifstream in(std::string(MAPCORE_IMAGE_DATA) + "/" + name, std::ios::binary);
    return Bytes(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

// baseline.jpg cut halfway through the scan that follows its start-of-scan marker.
Bytes baselineCutHalfwayThroughItsScan() {
    Bytes jpeg = readData("baseline.jpg");
    size_t scan = 0;
    while (scan + 1 < jpeg.size() && !(jpeg[scan] == 0xFF && jpeg[scan + 1] == 0xDA)) {
        ++scan;
    }
    jpeg.resize((scan + jpeg.size()) / 2);
    return jpeg;
}

boost::shared_ptr<Image> decode(const Bytes& bytes, Image::ImageFormat format) {
    IO::ByteArrayInputStream in(bytes.data(), static_cast<int>(bytes.size()));
    return Image::createImage(&in, format);
}

Bytes dataOf(const Image& image) {
    return Bytes(image.getData(), image.getData() + image.getSize());
}

// The pixels of a binary PPM or PGM with a plain "P6\nW H\n255\n" header.
Bytes netpbmPixels(const Bytes& file) {
    int newlines = 0;
    size_t i = 0;
    while (i < file.size() && newlines < 3) {
        newlines += file[i++] == '\n';
    }
    return Bytes(file.begin() + i, file.end());
}

// A JPEG that is all header: both sides, the sampling factors of each
// component (h << 4 | v), one quantisation table, one Huffman table of each
// kind, a scan with no data and the end marker. A progressive file's scan
// covers the first component's DC coefficients, a baseline file's scan every
// component, so that it is a single-scan file.
Bytes jpegHeaderOnly(unsigned side, const Bytes& sampling, bool progressive) {
    Bytes out = {0xFF, 0xD8};
    auto segment = [&out](unsigned char marker, const Bytes& body) {
        const size_t length = body.size() + 2;
        out.insert(out.end(), {0xFF, marker, static_cast<unsigned char>(length >> 8),
                               static_cast<unsigned char>(length & 0xFF)});
        out.insert(out.end(), body.begin(), body.end());
    };
    Bytes quantisation(65, 1);
    quantisation[0] = 0;
    segment(0xDB, quantisation);
    const unsigned char high = static_cast<unsigned char>(side >> 8);
    const unsigned char low = static_cast<unsigned char>(side & 0xFF);
    Bytes frame = {8, high, low, high, low, static_cast<unsigned char>(sampling.size())};
    for (size_t i = 0; i < sampling.size(); ++i) {
        frame.insert(frame.end(), {static_cast<unsigned char>(i + 1), sampling[i], 0});
    }
    segment(progressive ? 0xC2 : 0xC0, frame);
    // One code of length 1 in each table: DC difference 0, AC end of block.
    for (unsigned char tableClass : {0x00, 0x10}) {
        Bytes huffman(18, 0);
        huffman[0] = tableClass;
        huffman[1] = 1;
        segment(0xC4, huffman);
    }
    const size_t inScan = progressive ? 1 : sampling.size();
    Bytes scan = {static_cast<unsigned char>(inScan)};
    for (size_t i = 0; i < inScan; ++i) {
        scan.insert(scan.end(), {static_cast<unsigned char>(i + 1), 0x00});
    }
    scan.insert(scan.end(), {0, static_cast<unsigned char>(progressive ? 0 : 63), 0});
    segment(0xDA, scan);
    out.insert(out.end(), {0xFF, 0xD9});
    return out;
}

// The first 97 bytes of an RGBA PNG declaring side x side pixels: signature,
// header and the start of the data.
Bytes pngHeaderOnly(unsigned side) {
    Bytes png = readData("rgba8.png");
    for (int i = 0; i < 4; ++i) {
        png[16 + i] = static_cast<unsigned char>(side >> (24 - 8 * i));
        png[20 + i] = static_cast<unsigned char>(side >> (24 - 8 * i));
    }
    const unsigned long crc = crc32(0, png.data() + 12, 17);
    for (int i = 0; i < 4; ++i) {
        png[29 + i] = static_cast<unsigned char>(crc >> (24 - 8 * i));
    }
    png.resize(97);
    return png;
}

// Lets the address space of this process grow by at most extraBytes.
void limitAddressSpaceGrowth(rlim_t extraBytes) {
    std::ifstream status("/proc/self/status");
    std::string line;
    rlim_t sizeKb = 0;
    while (std::getline(status, line)) {
        if (line.compare(0, 7, "VmSize:") == 0) {
            sizeKb = std::stoul(line.substr(7));
        }
    }
    const rlimit limit = {sizeKb * 1024 + extraBytes, sizeKb * 1024 + extraBytes};
    setrlimit(RLIMIT_AS, &limit);
}

#if defined(__SANITIZE_ADDRESS__)
#define MAPCORE_ADDRESS_SANITIZER 1
#elif defined(__has_feature)
#if __has_feature(address_sanitizer)
#define MAPCORE_ADDRESS_SANITIZER 1
#endif
#endif

class ImageTest : public PalTest {};

struct PngCase {
    const char* name;
    unsigned bitsPerPixel;
    bool palette;
};

class PngDecodingTest : public ImageTest, public ::testing::WithParamInterface<PngCase> {};

TEST_P(PngDecodingTest, DecodesToTheBytesTheIndependentEncoderExpects) {
    const PngCase& c = GetParam();
    boost::shared_ptr<Image> image = decode(readData(std::string(c.name) + ".png"), Image::PNG);
    ASSERT_TRUE(image);
    EXPECT_EQ(image->getWidth(), 7u);
    EXPECT_EQ(image->getHeight(), 5u);
    EXPECT_EQ(image->getBitsPerPixel(), c.bitsPerPixel);
    EXPECT_EQ(image->getStride(), 7 * c.bitsPerPixel / 8);
    EXPECT_EQ(image->getPaletteSize(), c.palette ? 256u : 0u);
    EXPECT_EQ(image->getPaletteBitsPerEntry(), c.palette ? 24u : 0u);
    EXPECT_EQ(image->getSize(), (c.palette ? 768u : 0u) + 5 * image->getStride());
    EXPECT_EQ(dataOf(*image), readData(std::string(c.name) + ".expected"));
}

INSTANTIATE_TEST_SUITE_P(
    EveryColourTypeAndDepth, PngDecodingTest,
    ::testing::Values(PngCase{"gray1", 8, false}, PngCase{"gray2", 8, false}, PngCase{"gray4", 8, false},
                      PngCase{"gray8", 8, false}, PngCase{"gray16", 8, false}, PngCase{"palette1", 8, true},
                      PngCase{"palette2", 8, true}, PngCase{"palette4", 8, true},
                      PngCase{"palette8", 8, true}, PngCase{"rgb8", 24, false}, PngCase{"rgb16", 24, false},
                      PngCase{"grayalpha8", 32, false}, PngCase{"grayalpha16", 32, false},
                      PngCase{"rgba8", 32, false}, PngCase{"rgba16", 32, false},
                      PngCase{"rgb8-interlaced", 24, false}, PngCase{"palette2-interlaced", 8, true},
                      PngCase{"gray16-interlaced", 8, false}, PngCase{"grayalpha8-interlaced", 32, false}),
    [](const ::testing::TestParamInfo<PngCase>& info) {
        std::string name = info.param.name;
        return name.replace(name.find('-') == std::string::npos ? name.size() : name.find('-'), 1, "");
    });

struct JpegCase {
    const char* name;
    const char* source;
    unsigned bitsPerPixel;
    int tolerance;
};

class JpegDecodingTest : public ImageTest, public ::testing::WithParamInterface<JpegCase> {};

TEST_P(JpegDecodingTest, DecodesCloseToThePixelsTheFileWasMadeFrom) {
    const JpegCase& c = GetParam();
    boost::shared_ptr<Image> image = decode(readData(c.name), Image::JPEG);
    ASSERT_TRUE(image);
    EXPECT_EQ(image->getWidth(), 24u);
    EXPECT_EQ(image->getHeight(), 16u);
    EXPECT_EQ(image->getBitsPerPixel(), c.bitsPerPixel);
    EXPECT_EQ(image->getStride(), 24 * c.bitsPerPixel / 8);
    EXPECT_EQ(image->getPaletteSize(), 0u);
    Bytes expected = netpbmPixels(readData(c.source));
    Bytes actual = dataOf(*image);
    ASSERT_EQ(actual.size(), expected.size());
    int worst = 0;
    for (size_t i = 0; i < actual.size(); ++i) {
        worst = std::max(worst, std::abs(actual[i] - expected[i]));
    }
    EXPECT_LE(worst, c.tolerance);
    EXPECT_TRUE(logLines().empty());
}

INSTANTIATE_TEST_SUITE_P(CjpegOutput, JpegDecodingTest,
                         ::testing::Values(JpegCase{"baseline.jpg", "gradient.ppm", 24, 6},
                                           JpegCase{"progressive.jpg", "gradient.ppm", 24, 6},
                                           JpegCase{"subsampled-restart.jpg", "gradient.ppm", 24, 12},
                                           JpegCase{"gray.jpg", "gradient.pgm", 8, 4}));

TEST_F(ImageTest, ATruncatedJpegStillDecodesWithAWarningButAnEmptyOneFails) {
    const Bytes jpeg = baselineCutHalfwayThroughItsScan();
    boost::shared_ptr<Image> image = decode(jpeg, Image::JPEG);
    ASSERT_TRUE(image);
    EXPECT_EQ(image->getWidth(), 24u);
    EXPECT_EQ(image->getSize(), 24u * 16 * 3);
    EXPECT_EQ(countLogLines("Premature end of JPEG file"), 1);

    clearLog();
    EXPECT_FALSE(decode(Bytes(), Image::JPEG));
    EXPECT_EQ(countLogLines("Empty input file"), 1);
    EXPECT_FALSE(decode(Bytes(), Image::PNG));
}

// A stream that claims a megabyte more than it holds, as a damaged zip entry's header can.
class OverclaimingStream : public IO::ByteArrayInputStream {
public:
    explicit OverclaimingStream(const Bytes& bytes)
        : IO::ByteArrayInputStream(bytes.data(), static_cast<int>(bytes.size())) {}
    long long available() override { return held() + (1 << 20); }
    // Delivers what it holds, as a file or zip entry does at its real end.
    int read(void* buffer, int length) override {
        return IO::ByteArrayInputStream::read(buffer, static_cast<int>(std::min<long long>(length, held())));
    }

private:
    long long held() { return IO::ByteArrayInputStream::available(); }
};

TEST_F(ImageTest, AJpegStreamThatClaimsMoreThanItHoldsDecodesOnlyWhatItHolds) {
    // Cut, so the decoder asks for more than there is.
    const Bytes jpeg = baselineCutHalfwayThroughItsScan();
    boost::shared_ptr<Image> honest = decode(jpeg, Image::JPEG);
    ASSERT_TRUE(honest);

    OverclaimingStream in(jpeg);
    boost::shared_ptr<Image> image = Image::createImage(&in, Image::JPEG);
    ASSERT_TRUE(image);
    EXPECT_EQ(dataOf(*image), dataOf(*honest));
}

// Every prefix of a file, and the file with each byte in turn damaged, must
// give an image or nothing, without an assertion or a crash.
TEST_F(ImageTest, DamagedOrCutFilesGiveAnImageOrNothing) {
    const char* names[] = {"rgb8-interlaced.png", "palette4.png", "progressive.jpg",
                           "subsampled-restart.jpg"};
    for (const char* name : names) {
        const Image::ImageFormat format =
            std::string(name).find(".png") != std::string::npos ? Image::PNG : Image::JPEG;
        const Bytes file = readData(name);
        const Bytes whole = dataOf(*decode(file, format));
        for (size_t length = 0; length < file.size(); ++length) {
            boost::shared_ptr<Image> image = decode(Bytes(file.begin(), file.begin() + length), format);
            // A cut PNG decodes only when every row is there; a cut JPEG once its header is.
            if (image && format == Image::PNG) {
                EXPECT_EQ(dataOf(*image), whole) << name << " cut at " << length;
            } else if (image) {
                EXPECT_EQ(image->getSize(), whole.size()) << name << " cut at " << length;
            }
        }
        for (size_t at = 0; at < file.size(); ++at) {
            Bytes damaged = file;
            damaged[at] ^= 0x5A;
            boost::shared_ptr<Image> image = decode(damaged, format);
            if (image) {
                EXPECT_EQ(image->getSize(),
                          image->getStride() * image->getHeight() + image->getPaletteSize() * 3)
                    << name << " damaged at " << at;
            }
        }
    }
    EXPECT_TRUE(assertions().empty());
}

TEST_F(ImageTest, ImagesLargerThanTheLimitAreRefusedBeforeDecoding) {
    // Width and height of the IHDR chunk, then its CRC made right again.
    Bytes png = readData("rgb8.png");
    png[16] = 0;
    png[17] = 0;
    png[18] = 0x20;
    png[19] = 0x01;  // 8193 wide
    unsigned long crc = crc32(0, png.data() + 12, 17);
    for (int i = 0; i < 4; ++i) {
        png[29 + i] = static_cast<unsigned char>(crc >> (24 - 8 * i));
    }
    EXPECT_FALSE(decode(png, Image::PNG));
    EXPECT_EQ(countLogLines("PNG: 8193x5 is larger than 8192x8192"), 1);

    // The height and width of the start-of-frame segment.
    Bytes jpeg = readData("baseline.jpg");
    for (size_t i = 0; i + 8 < jpeg.size(); ++i) {
        if (jpeg[i] == 0xFF && jpeg[i + 1] == 0xC0) {
            jpeg[i + 5] = 0x7F;
            jpeg[i + 6] = 0xFF;
            break;
        }
    }
    EXPECT_FALSE(decode(jpeg, Image::JPEG));
    EXPECT_EQ(countLogLines("JPEG: 24x32767 is larger than 8192x8192"), 1);
}

TEST_F(ImageTest, ProgressiveHeadersDeclaringHugeImagesAreRefusedBeforeTheLibraryBuffersThem) {
    // Under 170 bytes each, declaring 64 Mpx: 4:2:0, 4:4:4 and gray.
    for (const Bytes& sampling : {Bytes{0x22, 0x11, 0x11}, Bytes{0x11, 0x11, 0x11}, Bytes{0x11}}) {
        clearLog();
        const Bytes jpeg = jpegHeaderOnly(8192, sampling, true);
        EXPECT_LT(jpeg.size(), 170u);
        EXPECT_FALSE(decode(jpeg, Image::JPEG)) << sampling.size();
        EXPECT_EQ(countLogLines("JPEG: buffering the image would take more than"), 1) << sampling.size();
    }
    // Real progressive files of moderate size still decode, data or not.
    const boost::shared_ptr<Image> image =
        decode(jpegHeaderOnly(1024, {0x22, 0x11, 0x11}, true), Image::JPEG);
    ASSERT_TRUE(image);
    EXPECT_EQ(image->getWidth(), 1024u);
    EXPECT_TRUE(decode(readData("progressive.jpg"), Image::JPEG));
}

TEST_F(ImageTest, TenComponentsAreRefusedBeforeTheLibraryAllocatesForThem) {
#ifdef MAPCORE_ADDRESS_SANITIZER
    GTEST_SKIP() << "an address-space limit and AddressSanitizer's shadow memory do not mix";
#endif
    if (std::getenv("MAPCORE_EMULATOR")) {
        GTEST_SKIP() << "under user-mode emulation the limit binds the emulator's own memory";
    }
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    const Bytes jpeg = jpegHeaderOnly(8192, Bytes(10, 0x11), true);
    EXPECT_LT(jpeg.size(), 170u);
    // Decoding it would first ask for 1.25 GiB of coefficients.
    EXPECT_EXIT(
        {
            limitAddressSpaceGrowth(64 << 20);
            const bool refused =
                !decode(jpeg, Image::JPEG) &&
                countLogLines("JPEG: 10 components in colour space 0 are not supported") == 1;
            std::_Exit(refused ? 0 : 1);
        },
        ::testing::ExitedWithCode(0), "");
}

TEST_F(ImageTest, RunningOutOfMemoryForThePixelsGivesNothing) {
#ifdef MAPCORE_ADDRESS_SANITIZER
    GTEST_SKIP() << "an address-space limit and AddressSanitizer's shadow memory do not mix";
#endif
    if (std::getenv("MAPCORE_EMULATOR")) {
        GTEST_SKIP() << "under user-mode emulation the limit binds the emulator's own memory";
    }
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    const Bytes png = pngHeaderOnly(8192);
    const Bytes jpeg = jpegHeaderOnly(8192, {0x22, 0x11, 0x11}, false);
    // 256 MiB and 192 MiB of pixels, in an address space that may grow by 64 MiB.
    EXPECT_EXIT(
        {
            limitAddressSpaceGrowth(64 << 20);
            const bool refused = !decode(png, Image::PNG) && !decode(jpeg, Image::JPEG) &&
                                 countLogLines("Image: no memory for 8192x8192 pixels") == 2;
            std::_Exit(refused ? 0 : 1);
        },
        ::testing::ExitedWithCode(0), "");
}

TEST_F(ImageTest, UnknownFormatsAndMissingSourcesGiveNothing) {
    Bytes png = readData("rgb8.png");
    IO::ByteArrayInputStream in(png.data(), static_cast<int>(png.size()));
    EXPECT_FALSE(Image::createImage(&in, 2));
    expectAssertion("false");
    EXPECT_FALSE(Image::createImage(nullptr, Image::PNG));
    EXPECT_FALSE(Image::createImageFromFile("/data/missing.png", Image::PNG));
    // A JPEG is not a PNG, nor the other way round.
    EXPECT_FALSE(decode(readData("baseline.jpg"), Image::PNG));
    EXPECT_FALSE(decode(png, Image::JPEG));
}

TEST_F(ImageTest, FilesAndResourcesDecodeThroughTheFileManager) {
    const Bytes png = readData("rgba8.png");
    {
        IO::FileOutputStream out;
        ASSERT_TRUE(out.init("/data/picture.png"));
        out.write(png.data(), static_cast<int>(png.size()));
    }
    boost::shared_ptr<Image> fromFile = Image::createImageFromFile("/data/picture.png", Image::PNG);
    ASSERT_TRUE(fromFile);
    EXPECT_EQ(dataOf(*fromFile), readData("rgba8.expected"));

    pal::setDeviceString(KD_STRING_PACKAGE_NAME_ZVR, "app");
    {
        boost::shared_ptr<IO::FileOutputStream> out = boost::make_shared<IO::FileOutputStream>();
        ASSERT_TRUE(out->init("/res/app.pak"));
        IO::Resource::PackageBuilder builder(out, 64);
        const Bytes jpeg = readData("gray.jpg");
        builder.addResource("icons/gray.jpg", jpeg.data(), jpeg.size(), false);
    }
    IO::FileManager::initResourceFileSystem();
    boost::shared_ptr<Image> fromResource = Image::createImageFromResource("icons/gray.jpg", Image::JPEG);
    EXPECT_FALSE(Image::createImageFromResource("icons/none.jpg", Image::JPEG));
    IO::FileManager::shutdownResourceFileSystem();
    ASSERT_TRUE(fromResource);
    EXPECT_EQ(fromResource->getBitsPerPixel(), 8u);
}

TEST_F(ImageTest, RawPixelsAreCopiedAndClonesAreDeep) {
    Bytes pixels = {1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 99};
    boost::shared_ptr<Image> image = Image::createImage(pixels, 2, 2, 24);
    ASSERT_TRUE(image);
    EXPECT_EQ(image->getStride(), 6u);
    EXPECT_EQ(dataOf(*image), Bytes(pixels.begin(), pixels.begin() + 12));
    pixels[0] = 50;
    EXPECT_EQ(image->getData()[0], 1);

    boost::shared_ptr<Image> copy = image->clone();
    copy->getData()[0] = 77;
    EXPECT_EQ(image->getData()[0], 1);
    EXPECT_EQ(copy->getStride(), 6u);
    EXPECT_EQ(copy->getSize(), 12u);

    boost::shared_ptr<Image> empty = Image::createImage(Bytes(), 0, 3, 32);
    ASSERT_TRUE(empty);
    EXPECT_EQ(empty->clone()->getData(), nullptr);

    // Fewer bytes than the size asks for, sizes beyond the limit, partial bytes.
    EXPECT_FALSE(Image::createImage(Bytes(11), 2, 2, 24));
    EXPECT_FALSE(Image::createImage(Bytes(4), 8193, 1, 8));
    EXPECT_FALSE(Image::createImage(Bytes(4), 0xFFFFFFFFu, 0xFFFFFFFFu, 32));
    EXPECT_FALSE(Image::createImage(Bytes(4), 2, 2, 4));
}

TEST_F(ImageTest, InverseChangesColoursOrPaletteEntriesAndKeepsAlphaAndGray) {
    const KDuint32 inverted = Math::Color(200, 30, 90, 255).inverseRGB();
    const Bytes invertedRgb = {static_cast<unsigned char>(inverted),
                               static_cast<unsigned char>(inverted >> 8),
                               static_cast<unsigned char>(inverted >> 16)};
    boost::shared_ptr<Image> rgba = Image::createImage({200, 30, 90, 17}, 1, 1, 32);
    rgba->inverse();
    EXPECT_EQ(dataOf(*rgba), (Bytes{invertedRgb[0], invertedRgb[1], invertedRgb[2], 17}));
    boost::shared_ptr<Image> gray = Image::createImage({10, 20}, 2, 1, 8);
    gray->inverse();
    EXPECT_EQ(dataOf(*gray), (Bytes{10, 20}));

    // Only the palette changes; a first entry of (200, 30, 90) stands for all.
    boost::shared_ptr<Image> paletted = decode(readData("palette4.png"), Image::PNG);
    ASSERT_TRUE(paletted);
    paletted->getData()[0] = 200;
    paletted->getData()[1] = 30;
    paletted->getData()[2] = 90;
    const Bytes before = dataOf(*paletted);
    paletted->inverse();
    const Bytes after = dataOf(*paletted);
    EXPECT_EQ(Bytes(after.begin(), after.begin() + 3), invertedRgb);
    EXPECT_TRUE(std::equal(before.begin() + 768, before.end(), after.begin() + 768));
}

}  // namespace
