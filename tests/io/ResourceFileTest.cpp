#include <boost/make_shared.hpp>
#include <boost/weak_ptr.hpp>
#include <cstdlib>
#include <typeinfo>

#include "IoTest.h"
#include "io/ByteArrayInputStream.h"
#include "io/ByteArrayOutputStream.h"
#include "io/Exception.h"
#include "io/FileInputStream.h"
#include "io/WrappedInputStream.h"
#include "io/resource/BlockInputStream.h"
#include "io/resource/PackageBuilder.h"
#include "io/resource/ResBlockInputStream.h"
#include "io/resource/ResourceFile.h"
#include "io/zip/GzipInputStream.h"
#include "io/zip/ZipOutputStream.h"

namespace {

using IO::Resource::BlockInputStream;
using IO::Resource::PackageBuilder;
using IO::Resource::ResourceFile;

// Serves blocks of a byte vector from memory and records which it was asked for.
class BlockSource {
public:
    BlockSource(const std::vector<unsigned char>& data, unsigned int blockSize)
        : data(data), blockSize(blockSize) {}

    boost::shared_ptr<IO::InputStream> open(unsigned int index) {
        opened.push_back(index);
        size_t begin = static_cast<size_t>(index) * blockSize;
        if (begin >= data.size() || missing == static_cast<int>(index)) {
            return boost::shared_ptr<IO::InputStream>();
        }
        size_t size = std::min<size_t>(blockSize + extraBytes, data.size() - begin);
        boost::shared_ptr<IO::InputStream> block =
            boost::make_shared<IO::ByteArrayInputStream>(data.data() + begin, static_cast<int>(size));
        handedOut.push_back(block);
        return block;
    }

    int stillOpen() const {
        int count = 0;
        for (const boost::weak_ptr<IO::InputStream>& block : handedOut) {
            count += !block.expired();
        }
        return count;
    }

    BlockInputStream::BlockOpener opener() {
        return BlockInputStream::BlockOpener::make<BlockSource, &BlockSource::open>(this);
    }

    std::vector<unsigned int> opened;
    std::vector<boost::weak_ptr<IO::InputStream> > handedOut;
    int missing = -1;
    // Serves blocks longer than the block size, as a damaged package could.
    unsigned int extraBytes = 0;

private:
    const std::vector<unsigned char>& data;
    unsigned int blockSize;
};

class ResourceFileTest : public IoTest {
protected:
    // A package in memory made by the builder.
    boost::shared_ptr<IO::ByteArrayOutputStream> package = boost::make_shared<IO::ByteArrayOutputStream>();

    boost::shared_ptr<IO::InputStream> packageStream() {
        return boost::make_shared<IO::ByteArrayInputStream>(package->getData().data(),
                                                            static_cast<int>(package->getData().size()));
    }

    boost::shared_ptr<IO::InputStream> openResource(const std::string& name,
                                                    boost::shared_ptr<IO::Resource::FileSystem> index) {
        boost::shared_ptr<ResourceFile> resource = boost::make_shared<ResourceFile>(packageStream());
        return resource->openInputStream(name, index);
    }

    // A package of the one resource "X" holding thousand.
    void buildPackage(unsigned int blockSize, bool compressed) {
        PackageBuilder builder(package, blockSize);
        EXPECT_TRUE(builder.addResource("X", thousand.data(), thousand.size(), compressed));
    }
    boost::shared_ptr<IO::Resource::FileSystem> index() {
        return ResourceFile::createFileSystem(packageStream());
    }
    // "X" split in three by hand, with the given extra field, which the builder never writes.
    void writeDamagedPackage(const Bytes& extra, bool withLastPart) {
        IO::Zip::ZipOutputStream zip(package);
        zip.openEntry("X", true, extra);
        zip.write(thousand.data(), 400);
        zip.closeEntry();
        zip.openEntry("X.part001", false);
        zip.write(thousand.data() + 400, 400);
        zip.closeEntry();
        if (withLastPart) {
            zip.openEntry("X.part002", true);
            zip.write(thousand.data() + 800, 200);
            zip.closeEntry();
        }
    }

    Bytes thousand = pattern(1000, 7);
};

// A block stream over thousand in blocks of 400 bytes, served from memory.
class BlockStreamTest : public ResourceFileTest {
protected:
    BlockSource source{thousand, 400};
    BlockInputStream stream{source.opener(), 1000, 400};
    std::vector<unsigned int>& opened = source.opened;

    Bytes read(long long at, int length) {
        stream.seek(at, KD_SEEK_SET);
        Bytes bytes(length);
        EXPECT_EQ(length, stream.read(bytes.data(), length)) << at;
        return bytes;
    }
};

}  // namespace

TEST_F(BlockStreamTest, OpensOnlyTheBlocksAReadTouchesAndNothingOnASeek) {
    stream.seek(850, KD_SEEK_SET);
    EXPECT_TRUE(opened.empty());
    EXPECT_EQ(slice(thousand, 850, 150), read(850, 150));
    EXPECT_EQ((std::vector<unsigned int>{2}), opened);
    EXPECT_EQ(slice(thousand, 300, 100), read(300, 100));
    EXPECT_EQ(slice(thousand, 350, 100), read(350, 100));
    EXPECT_EQ((std::vector<unsigned int>{2, 0, 1}), opened);
    EXPECT_EQ(thousand, read(0, 1000));
    EXPECT_EQ(0, stream.available());
}

TEST_F(BlockStreamTest, ASequentialReadKeepsOnlyTheBlockItIsReading) {
    Bytes chunk(150);
    for (long long at = 0; at < 1000; at += 150) {
        int length = static_cast<int>(std::min<long long>(150, 1000 - at));
        EXPECT_EQ(length, stream.read(chunk.data(), length));
        EXPECT_EQ(slice(thousand, at, length), slice(chunk, 0, length));
        EXPECT_EQ(1, source.stillOpen()) << at;
    }
    EXPECT_EQ((std::vector<unsigned int>{0, 1, 2}), opened);
}

TEST_F(BlockStreamTest, ReadsAndSeeksPastTheEndStopThereWithoutTouchingAFurtherBlock) {
    stream.seek(-10, KD_SEEK_END);
    Bytes buffer(50, 0xff);
    EXPECT_EQ(10, stream.read(buffer.data(), 50));
    EXPECT_EQ(slice(thousand, 990, 10), slice(buffer, 0, 10));
    EXPECT_EQ(Bytes(40, 0), slice(buffer, 10, 40));
    expectAssertion("false");
    EXPECT_EQ(0, stream.read(buffer.data(), 50));
    expectAssertion("false");
    EXPECT_EQ((std::vector<unsigned int>{2}), opened);
    stream.seek(-5, KD_SEEK_SET);
    EXPECT_EQ(0, stream.tell());
    stream.seek(5000, KD_SEEK_CUR);
    EXPECT_EQ(1000, stream.tell());
}

TEST_F(BlockStreamTest, AMissingBlockEndsTheReadShortAndALongOneLendsNoBytes) {
    source.missing = 1;
    Bytes all(1000);
    EXPECT_EQ(400, stream.read(all.data(), 1000));
    EXPECT_EQ(400, stream.tell());
    expectAssertion("false");

    // A damaged package could serve blocks longer than the block size.
    BlockSource longBlocks(thousand, 400);
    longBlocks.extraBytes = 50;
    BlockInputStream fromLongBlocks(longBlocks.opener(), 1000, 400);
    EXPECT_EQ(1000, fromLongBlocks.read(all.data(), 1000));
    EXPECT_EQ(thousand, all);
}

TEST_F(ResourceFileTest, OnlyAResourceLargerThanItsBlockIsSplitAndReadsBackWithOrWithoutAnIndex) {
    const Bytes four = pattern(400, 3);
    {
        PackageBuilder builder(package, 400);
        EXPECT_TRUE(builder.addResource("X", thousand.data(), thousand.size(), true));
        EXPECT_TRUE(builder.addResource("four", four.data(), four.size(), true));
    }
    boost::shared_ptr<IO::InputStream> stream = openResource("X", index());
    ASSERT_TRUE(dynamic_cast<IO::Resource::ResBlockInputStream*>(stream.get()));
    EXPECT_EQ(1000, stream->available());
    stream->seek(850, KD_SEEK_SET);
    EXPECT_EQ(slice(thousand, 850, 150), readAll(*stream));
    stream->seek(0, KD_SEEK_SET);
    EXPECT_EQ(thousand, readAll(*stream));

    stream = openResource("X", boost::shared_ptr<IO::Resource::FileSystem>());
    ASSERT_TRUE(stream);
    EXPECT_EQ(thousand, readAll(*stream));

    stream = openResource("four", index());
    ASSERT_TRUE(stream);
    EXPECT_FALSE(dynamic_cast<IO::Resource::ResBlockInputStream*>(stream.get()));
    EXPECT_EQ(four, readAll(*stream));
}

TEST_F(ResourceFileTest, StoredPartsShareOnePackageStreamAndStillReadRight) {
    buildPackage(300, false);
    boost::shared_ptr<IO::InputStream> stream = openResource("X", index());
    ASSERT_TRUE(stream);
    Bytes buffer(5);
    for (long long at : {995LL, 5LL, 605LL, 295LL, 0LL}) {
        stream->seek(at, KD_SEEK_SET);
        EXPECT_EQ(5, stream->read(buffer.data(), 5)) << at;
        EXPECT_EQ(slice(thousand, at, 5), buffer) << at;
    }
}

TEST_F(ResourceFileTest, AMissingResourceOrAnUnreadablePackageIsEmpty) {
    buildPackage(0, true);
    EXPECT_FALSE(openResource("Y", index()));
    EXPECT_TRUE(hasLogLine("File Y not found in resource"));

    const Bytes garbage = bytesOf("this is not a zip archive at all");
    EXPECT_FALSE(ResourceFile::createFileSystem(
        boost::make_shared<IO::ByteArrayInputStream>(garbage.data(), static_cast<int>(garbage.size()))));
    expectAssertion("false");
}

TEST_F(ResourceFileTest, ASplitResourceWhosePartsDoNotHoldItsClaimDoesNotOpen) {
    const std::string claims = "ResourceFile: X claims";
    // 1000 bytes claimed, the last part missing: the design's assertion, and no stream.
    writeDamagedPackage({0xE8, 0x03, 0, 0, 0x90, 0x01, 0, 0}, false);
    EXPECT_FALSE(openResource("X", index()));
    expectAssertion("entry");
    EXPECT_EQ(1, countLogLines(claims));

    // 4 GiB in blocks of one byte, and 2 GiB in blocks of 16: nothing is sized from the claim.
    for (const Bytes& extra :
         {Bytes{0xff, 0xff, 0xff, 0xff, 1, 0, 0, 0}, Bytes{0, 0, 0, 0x80, 16, 0, 0, 0}}) {
        package = boost::make_shared<IO::ByteArrayOutputStream>();
        writeDamagedPackage(extra, true);
        clearLog();
        EXPECT_FALSE(openResource("X", index()));
        EXPECT_EQ(1, countLogLines(claims));
    }

    // Every part there, but one shorter or longer than the claim says.
    for (const Bytes& extra :
         {Bytes{0xE7, 0x03, 0, 0, 0x90, 0x01, 0, 0}, Bytes{0xE8, 0x03, 0, 0, 0x91, 0x01, 0, 0}}) {
        package = boost::make_shared<IO::ByteArrayOutputStream>();
        writeDamagedPackage(extra, true);
        clearLog();
        EXPECT_FALSE(openResource("X", index()));
        EXPECT_EQ(1, countLogLines(claims));
    }

    package = boost::make_shared<IO::ByteArrayOutputStream>();
    writeDamagedPackage({0xE8, 0x03, 0, 0, 0, 0, 0, 0}, true);
    EXPECT_FALSE(openResource("X", index()));
    expectAssertion("blockSize > 0");
}

TEST_F(ResourceFileTest, AnEntryWithAnotherToolsExtraFieldIsOneWholeResource) {
    writeDamagedPackage({0x55, 0x54, 0x05, 0x00, 0x03, 0x10, 0x20, 0x30, 0x40}, true);
    boost::shared_ptr<IO::Resource::FileSystem> packed = index();
    EXPECT_EQ(1, countLogLines("Resource package: 1 entries carry extra fields of other tools"));
    boost::shared_ptr<IO::InputStream> stream = openResource("X", packed);
    ASSERT_TRUE(stream);
    EXPECT_EQ(slice(thousand, 0, 400), readAll(*stream));
}

TEST_F(ResourceFileTest, APackageMadeByTheZipCommandReadsBack) {
    // Info-ZIP adds a timestamp and an owner field to every entry.
    const Bytes big = pattern(70000, 21);
    const Bytes text = bytesOf("plain text resource\n");
    writeFile("/in/maps/big.bin", big);
    writeFile("/in/text.txt", text);
    const std::string command = "cd '" + hostPath("/in") + "' && zip -q -r ../pkg.zip maps text.txt";
    ASSERT_EQ(0, std::system(command.c_str()));
    boost::shared_ptr<IO::FileInputStream> file = boost::make_shared<IO::FileInputStream>();
    ASSERT_TRUE(file->init("/pkg.zip"));
    boost::shared_ptr<IO::Resource::FileSystem> packed = ResourceFile::createFileSystem(file);
    ASSERT_TRUE(packed);
    EXPECT_EQ(1, countLogLines("entries carry extra fields of other tools"));
    for (auto expected : {std::make_pair("maps/big.bin", big), std::make_pair("text.txt", text)}) {
        boost::shared_ptr<IO::FileInputStream> again = boost::make_shared<IO::FileInputStream>();
        ASSERT_TRUE(again->init("/pkg.zip"));
        boost::shared_ptr<IO::InputStream> stream =
            boost::make_shared<ResourceFile>(again)->openInputStream(expected.first, packed);
        ASSERT_TRUE(stream) << expected.first;
        EXPECT_EQ(expected.second, readAll(*stream)) << expected.first;
    }
}

TEST_F(ResourceFileTest, EveryStreamKindThrowsOnAReadPastItsEndOnceExceptionsAreEnabled) {
    const Bytes small = pattern(100, 5);
    {
        PackageBuilder builder(package, 400);
        builder.addResource("stored", small.data(), small.size(), false);
        builder.addResource("deflated", small.data(), small.size(), true);
        builder.addResource("X", thousand.data(), thousand.size(), false);
    }
    writeFile("/data/f", small);
    boost::shared_ptr<IO::FileInputStream> file = boost::make_shared<IO::FileInputStream>();
    ASSERT_TRUE(file->init("/data/f"));
    boost::shared_ptr<IO::Zip::ZipFile> zip = boost::make_shared<IO::Zip::ZipFile>();
    ASSERT_TRUE(zip->init(packageStream(), nullptr));
    boost::shared_ptr<IO::Zip::ZipFile> inflating = boost::make_shared<IO::Zip::ZipFile>();
    ASSERT_TRUE(inflating->init(packageStream(), nullptr));
    const Bytes garbage = bytesOf("\x1f\x8b damaged");
    IO::ByteArrayInputStream garbageStream(garbage.data(), static_cast<int>(garbage.size()));
    const boost::shared_ptr<IO::InputStream> streams[] = {
        boost::make_shared<IO::ByteArrayInputStream>(small.data(), static_cast<int>(small.size())),
        file,
        boost::make_shared<IO::WrappedInputStream>(packageStream(), 10, 20),
        zip->getInputStream(*zip->findEntry("stored"), true),
        zip->getInputStream(*zip->findEntry("deflated"), true),
        inflating->getInputStream(*inflating->findEntry("deflated"), false),
        openResource("X", index()),
        boost::make_shared<IO::Zip::GzipInputStream>(&garbageStream),
    };
    for (const boost::shared_ptr<IO::InputStream>& stream : streams) {
        ASSERT_TRUE(stream);
        stream->enableExceptions();
        readAll(*stream);
        EXPECT_THROW(stream->readInt(), IO::Exception) << typeid(*stream).name();
    }
}

TEST_F(ResourceFileTest, TheBuilderRefusesNamesThatWouldCollide) {
    PackageBuilder builder(package, 400);
    EXPECT_TRUE(builder.addResource("a", thousand.data(), 1000, true));
    EXPECT_FALSE(builder.addResource("a", thousand.data(), 10, true));
    EXPECT_FALSE(builder.addResource("a.part002", thousand.data(), 10, true));
    EXPECT_TRUE(builder.addResource("b.part001", thousand.data(), 10, true));
    EXPECT_FALSE(builder.addResource("b", thousand.data(), 1000, true));
    EXPECT_FALSE(builder.addResource("", thousand.data(), 10, true));
    EXPECT_TRUE(builder.addResource(std::string(255, 'n'), thousand.data(), 10, true));
    EXPECT_FALSE(builder.addResource(std::string(250, 'm'), thousand.data(), 1000, true));
    EXPECT_EQ(5, countLogLines("PackageBuilder:"));
}

TEST_F(ResourceFileTest, TheBuilderPacksAFolderThatReadsBackByteForByteAndTheSameEachTime) {
    Bytes big = pattern(5000, 11);
    Bytes small = bytesOf("small text");
    Bytes image = pattern(700, 12);
    writeFile("/data/in/big.bin", big);
    writeFile("/data/in/sub/small.txt", small);
    writeFile("/data/in/sub/deeper/image.png", image);
    writeFile("/data/in/empty", Bytes());
    boost::shared_ptr<IO::ByteArrayOutputStream> again = boost::make_shared<IO::ByteArrayOutputStream>();
    for (const boost::shared_ptr<IO::ByteArrayOutputStream>& out : {package, again}) {
        PackageBuilder builder(out, 1024);
        EXPECT_EQ(4, builder.addDirectory("/data/in/", true, {".png"}));
    }
    EXPECT_EQ(package->getData(), again->getData());
    boost::shared_ptr<IO::Resource::FileSystem> packed = index();
    ASSERT_TRUE(packed);
    for (auto expected : {std::make_pair("big.bin", big), std::make_pair("sub/small.txt", small),
                          std::make_pair("sub/deeper/image.png", image), std::make_pair("empty", Bytes())}) {
        boost::shared_ptr<IO::InputStream> stream = openResource(expected.first, packed);
        ASSERT_TRUE(stream) << expected.first;
        EXPECT_EQ(expected.second, readAll(*stream)) << expected.first;
    }
    boost::shared_ptr<IO::Zip::ZipFile> zip = boost::make_shared<IO::Zip::ZipFile>();
    ASSERT_TRUE(zip->init(packageStream(), nullptr));
    EXPECT_FALSE(zip->findEntry("sub/deeper/image.png")->compressed);
    EXPECT_TRUE(zip->findEntry("sub/small.txt")->compressed);
    EXPECT_TRUE(zip->findEntry("big.bin.part004"));
    EXPECT_EQ((Bytes{0x88, 0x13, 0, 0, 0, 4, 0, 0}), zip->findEntry("big.bin")->extra);
}
