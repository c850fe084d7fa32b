#include <algorithm>
#include <boost/make_shared.hpp>

#include "IoTest.h"
#include "io/BufferInputStream.h"
#include "io/ByteArrayInputStream.h"
#include "io/ByteArrayOutputStream.h"
#include "io/FileInputStream.h"
#include "io/zip/ZipFile.h"
#include "io/zip/ZipOutputStream.h"
#include "io/zip/impl/StoredZipInputStream.h"
#include "io/zip/impl/UncachedZipInputStream.h"

namespace {

using IO::Zip::ZipEntry;
using IO::Zip::ZipEntryMap;
using IO::Zip::ZipFile;

// Starts with zip open on a stored text entry "a.txt" and a deflated binary one "b.bin".
class ZipFileTest : public IoTest {
protected:
    struct Item {
        std::string name;
        Bytes data;
        bool compressed;
        Bytes extra;
    };

    void SetUp() override {
        IoTest::SetUp();
        zip = open(textAndBinary());
        ASSERT_TRUE(zip);
    }

    static Bytes archive(const std::vector<Item>& items) {
        boost::shared_ptr<IO::ByteArrayOutputStream> out = boost::make_shared<IO::ByteArrayOutputStream>();
        {
            IO::Zip::ZipOutputStream writer(out);
            for (const Item& item : items) {
                writer.openEntry(item.name.c_str(), item.compressed, item.extra);
                if (!item.data.empty()) {
                    writer.write(item.data.data(), static_cast<int>(item.data.size()));
                }
                writer.closeEntry();
            }
        }
        return out->getData();
    }
    Bytes textAndBinary() const { return archive({{"a.txt", text, false, {}}, {"b.bin", binary, true, {}}}); }

    // The zip file reads from a copy kept alive by the test.
    boost::shared_ptr<ZipFile> open(const Bytes& bytes, const ZipEntryMap* prepared = nullptr) {
        held.push_back(boost::make_shared<Bytes>(bytes));
        boost::shared_ptr<ZipFile> opened = boost::make_shared<ZipFile>();
        return opened->init(memoryStream(*held.back()), prepared) ? opened : boost::shared_ptr<ZipFile>();
    }
    static boost::shared_ptr<IO::InputStream> memoryStream(const Bytes& bytes) {
        return boost::make_shared<IO::ByteArrayInputStream>(bytes.data(), static_cast<int>(bytes.size()));
    }

    static boost::shared_ptr<IO::InputStream> entryStream(ZipFile& from, const std::string& name,
                                                          bool cached) {
        return from.getInputStream(*from.findEntry(name), cached);
    }
    static Bytes entryBytes(ZipFile& from, const std::string& name, bool cached) {
        const ZipEntry* entry = from.findEntry(name);
        boost::shared_ptr<IO::InputStream> stream = entry ? from.getInputStream(*entry, cached) : nullptr;
        return stream ? readAll(*stream) : Bytes();
    }
    static Bytes readSome(IO::InputStream& stream, int length) {
        Bytes bytes(length);
        bytes.resize(std::max(0, stream.read(bytes.data(), length)));
        return bytes;
    }

    std::vector<boost::shared_ptr<Bytes> > held;
    const Bytes text = bytesOf("stored text, read straight from the archive");
    const Bytes binary = pattern(70000);
    boost::shared_ptr<ZipFile> zip;
};

}  // namespace

TEST_F(ZipFileTest, StoredAndDeflatedEntriesReadBackThroughTheirStreamKinds) {
    const ZipEntry* stored = zip->findEntry("a.txt");
    ASSERT_TRUE(stored);
    EXPECT_FALSE(stored->compressed);
    EXPECT_EQ(text.size(), stored->uncompressedSize);
    EXPECT_EQ(text.size(), stored->compressedSize);
    boost::shared_ptr<IO::InputStream> storedStream = zip->getInputStream(*stored, true);
    EXPECT_TRUE(dynamic_cast<IO::Zip::StoredZipInputStream*>(storedStream.get()));
    EXPECT_EQ(text, readAll(*storedStream));

    const ZipEntry* deflated = zip->findEntry("b.bin");
    ASSERT_TRUE(deflated);
    EXPECT_TRUE(deflated->compressed);
    EXPECT_EQ(binary.size(), deflated->uncompressedSize);
    boost::shared_ptr<IO::InputStream> cachedStream = zip->getInputStream(*deflated, true);
    EXPECT_TRUE(dynamic_cast<IO::BufferInputStream<unsigned char>*>(cachedStream.get()));
    EXPECT_EQ(binary, readAll(*cachedStream));

    // The same through a file stream, uncached.
    writeFile("/data/a.zip", textAndBinary());
    boost::shared_ptr<IO::FileInputStream> file = boost::make_shared<IO::FileInputStream>();
    ASSERT_TRUE(file->init("/data/a.zip"));
    zip = boost::make_shared<ZipFile>();
    ASSERT_TRUE(zip->init(file, nullptr));
    EXPECT_EQ(binary, entryBytes(*zip, "b.bin", false));
    EXPECT_EQ(text, entryBytes(*zip, "a.txt", false));
}

TEST_F(ZipFileTest, AnUncachedStreamInflatesWhileReadingAndOwnsTheArchiveMeanwhile) {
    {
        boost::shared_ptr<IO::InputStream> stream = entryStream(*zip, "b.bin", false);
        ASSERT_TRUE(dynamic_cast<IO::Zip::UncachedZipInputStream*>(stream.get()));
        EXPECT_EQ(static_cast<long long>(binary.size()), stream->available());
        EXPECT_EQ(slice(binary, 0, 10), readSome(*stream, 10));
        EXPECT_EQ(10, stream->tell());

        EXPECT_FALSE(entryStream(*zip, "a.txt", true));
        expectAssertion("false");
        stream->seek(0, KD_SEEK_SET);
        expectAssertion("false && \"Unsupported\"");

        EXPECT_EQ(slice(binary, 10, binary.size() - 10), readAll(*stream));
        EXPECT_EQ(Bytes(), readSome(*stream, 1));
        expectAssertion("false");
    }
    EXPECT_EQ(text, entryBytes(*zip, "a.txt", true));
}

TEST_F(ZipFileTest, AStoredStreamKeepsItsBytesWhileOtherEntriesAreInflated) {
    boost::shared_ptr<IO::InputStream> stored = entryStream(*zip, "a.txt", false);
    EXPECT_EQ(slice(text, 0, 5), readSome(*stored, 5));
    boost::shared_ptr<IO::InputStream> inflating = entryStream(*zip, "b.bin", false);
    EXPECT_EQ(slice(binary, 0, 1000), readSome(*inflating, 1000));
    EXPECT_EQ(slice(text, 5, text.size() - 5), readAll(*stored));
    EXPECT_EQ(slice(binary, 1000, binary.size() - 1000), readAll(*inflating));
}

TEST_F(ZipFileTest, EntryStreamsThatReadTheArchiveKeepTheZipFileAlive) {
    boost::shared_ptr<IO::InputStream> stored = entryStream(*zip, "a.txt", true);
    boost::weak_ptr<ZipFile> watch = zip;
    zip.reset();
    EXPECT_FALSE(watch.expired());
    EXPECT_EQ(text, readAll(*stored));
    stored.reset();
    EXPECT_TRUE(watch.expired());
}

TEST_F(ZipFileTest, APreparedIndexIsCopiedOrShared) {
    boost::shared_ptr<ZipFile> copied = open(textAndBinary(), &zip->getEntries());
    ASSERT_TRUE(copied);
    EXPECT_NE(zip->findEntry("b.bin"), copied->findEntry("b.bin"));
    EXPECT_EQ(binary, entryBytes(*copied, "b.bin", true));

    boost::shared_ptr<ZipFile> shared = boost::make_shared<ZipFile>();
    ASSERT_TRUE(shared->initWithIndex(memoryStream(*held.front()), zip->getIndex()));
    EXPECT_EQ(zip->findEntry("b.bin"), shared->findEntry("b.bin"));
    zip.reset();
    EXPECT_EQ(binary, entryBytes(*shared, "b.bin", true));
    EXPECT_EQ(text, entryBytes(*shared, "a.txt", true));
}

TEST_F(ZipFileTest, TheCentralExtraFieldIsKeptAsWritten) {
    // 0x00010001 begins with the zip64 extra field's header id; the bytes must come back as
    // they were and must not disturb the entries that follow.
    const Bytes extra = {0x01, 0x00, 0x01, 0x00, 0x90, 0x01, 0x00, 0x00};
    const Bytes other = {1, 2, 3, 4, 5, 6, 7, 8};
    zip = open(archive({{"x", text, true, extra}, {"y", binary, false, {}}, {"z", text, true, other}}));
    ASSERT_TRUE(zip);
    EXPECT_EQ(extra, zip->findEntry("x")->extra);
    EXPECT_EQ(other, zip->findEntry("z")->extra);
    EXPECT_EQ(text, entryBytes(*zip, "x", true));
    EXPECT_EQ(binary, entryBytes(*zip, "y", true));
    EXPECT_EQ(text, entryBytes(*zip, "z", true));
}

TEST_F(ZipFileTest, LongNamesAreIndexedWholeAndOpen) {
    // minizip cannot search for a name of 256 bytes or more; entries are not searched for.
    const std::string name(300, 'n');
    zip = open(archive({{name, text, false, {}}, {name + "x", binary, true, {}}}));
    ASSERT_TRUE(zip);
    EXPECT_EQ(text, entryBytes(*zip, name, true));
    EXPECT_EQ(binary, entryBytes(*zip, name + "x", true));
}

TEST_F(ZipFileTest, IndexingReadsOnlyTheDirectorySoADamagedLocalHeaderSpoilsOnlyItsEntry) {
    Bytes bytes = textAndBinary();
    const Bytes local = {0x50, 0x4b, 0x03, 0x04};
    auto second = std::search(std::search(bytes.begin(), bytes.end(), local.begin(), local.end()) + 4,
                              bytes.end(), local.begin(), local.end());
    second[0] = 'X';
    zip = open(bytes);
    ASSERT_TRUE(zip);
    EXPECT_EQ(text, entryBytes(*zip, "a.txt", true));
    EXPECT_FALSE(entryStream(*zip, "b.bin", true));
    expectAssertion("false");
}

TEST_F(ZipFileTest, SizesThatTheArchiveCannotHoldAreRefusedBeforeAnythingIsSizedFromThem) {
    // Patches the sizes of the entry at index in its local header and its directory record alike
    // (minizip itself refuses the two when they disagree).
    auto lying = [this](size_t index, unsigned int compressedSize, unsigned int uncompressedSize) {
        Bytes bytes = textAndBinary();
        for (const auto& record : {std::make_pair(Bytes{0x50, 0x4b, 0x03, 0x04}, 18),
                                   std::make_pair(Bytes{0x50, 0x4b, 0x01, 0x02}, 20)}) {
            auto at = bytes.begin() - 4;
            for (size_t i = 0; i <= index; ++i) {
                at = std::search(at + 4, bytes.end(), record.first.begin(), record.first.end());
            }
            for (int i = 0; i < 4; ++i) {
                at[record.second + i] = static_cast<unsigned char>(compressedSize >> (8 * i));
                at[record.second + 4 + i] = static_cast<unsigned char>(uncompressedSize >> (8 * i));
            }
        }
        return bytes;
    };
    const unsigned int deflated = zip->findEntry("b.bin")->compressedSize;
    const struct {
        Bytes archive;
        const char* name;
    } cases[] = {
        {lying(1, deflated, 0x7fffffff), "b.bin"},
        {lying(1, 0x7fffff00, 0x7fffffff), "b.bin"},
        {lying(0, 0x100000, 0x100000), "a.txt"},
        {lying(0, static_cast<unsigned int>(text.size()), 1), "a.txt"},
    };
    for (const auto& item : cases) {
        clearLog();
        boost::shared_ptr<ZipFile> damaged = open(item.archive);
        ASSERT_TRUE(damaged);
        for (bool cached : {true, false}) {
            EXPECT_FALSE(entryStream(*damaged, item.name, cached)) << item.name;
            expectAssertion("false");
        }
        EXPECT_EQ(2, countLogLines(std::string("ZipFile: entry ") + item.name + " claims more data"));
    }
}

TEST_F(ZipFileTest, EmptyAndRepeatedEntriesWorkAndAnArchiveWithoutEntriesIsRefused) {
    zip = open(archive(
        {{"e1", {}, true, {}}, {"e2", {}, false, {}}, {"a", text, true, {}}, {"a", binary, false, {}}}));
    ASSERT_TRUE(zip);
    EXPECT_EQ(0, entryStream(*zip, "e1", true)->available());
    EXPECT_EQ(0, entryStream(*zip, "e2", true)->available());
    // A later entry of the same name wins.
    EXPECT_EQ(3u, zip->getEntries().size());
    EXPECT_EQ(binary, entryBytes(*zip, "a", true));

    // minizip does not open an archive that is only an end record.
    EXPECT_FALSE(open(archive({})));
    expectAssertion("false");
}

TEST_F(ZipFileTest, ATruncatedArchiveFailsClearlyAtEveryCut) {
    const Bytes small = pattern(3000);
    const Bytes bytes = archive({{"a.txt", text, false, {}}, {"b.bin", small, true, {}}});
    for (size_t cut = 0; cut < bytes.size(); cut += 7) {
        boost::shared_ptr<ZipFile> truncated = open(slice(bytes, 0, cut));
        if (!truncated) {
            EXPECT_GT(claimAssertions(), 0) << cut;
            continue;
        }
        // Only the end record was cut into: an entry is missing, or reads whole, or fails.
        EXPECT_GT(cut, bytes.size() - 22) << cut;
        if (truncated->findEntry("b.bin")) {
            const Bytes read = entryBytes(*truncated, "b.bin", true);
            EXPECT_TRUE(read == small || (read.empty() && claimAssertions() > 0)) << cut;
        }
    }
}

TEST_F(ZipFileTest, ACorruptArchiveNeverCrashesAndNeverHandsOutDamagedInflatedData) {
    const Bytes small = pattern(3000);
    const Bytes bytes = archive({{"a.txt", text, false, {}}, {"b.bin", small, true, {}}});
    for (size_t at = 0; at < bytes.size(); ++at) {
        Bytes corrupt = bytes;
        corrupt[at] ^= 0xA5;
        boost::shared_ptr<ZipFile> damaged = open(corrupt);
        for (const auto& item : damaged ? damaged->getEntries() : ZipEntryMap()) {
            const Bytes cached = entryBytes(*damaged, item.first, true);
            if (item.first == "b.bin") {
                EXPECT_TRUE(cached.empty() || cached == small) << at;
            }
            EXPECT_LE(entryBytes(*damaged, item.first, false).size(), item.second.uncompressedSize) << at;
        }
        claimAssertions();
    }
}

TEST_F(ZipFileTest, ADirectoryRecordRunningPastTheArchiveIsRefusedAtOpenWithOneLineAndFewReads) {
    // Counts what reaches the archive stream: minizip walks a claimed field byte by byte, and
    // none of that may turn into a read or seek of the stream each.
    class CountingStream : public IO::ByteArrayInputStream {
    public:
        using ByteArrayInputStream::ByteArrayInputStream;
        int read(void* buffer, int length) override {
            ++calls;
            return ByteArrayInputStream::read(buffer, length);
        }
        void seek(long long offset, KDfileSeekOrigin origin) override {
            ++calls;
            ByteArrayInputStream::seek(offset, origin);
        }
        int calls = 0;
    };
    // Name, extra field and comment lengths of the first directory record.
    const unsigned int claims[][3] = {
        {0xfffb, 0xffff, 0xfffd}, {5, 0xffff, 0}, {5, 0, 0xfff0}, {0xff00, 0, 0}};
    const Bytes intact = textAndBinary();
    boost::shared_ptr<CountingStream> intactStream =
        boost::make_shared<CountingStream>(intact.data(), static_cast<int>(intact.size()));
    ASSERT_TRUE(boost::make_shared<ZipFile>()->init(intactStream, nullptr));
    for (const auto& lengths : claims) {
        Bytes bytes = intact;
        const Bytes central = {0x50, 0x4b, 0x01, 0x02};
        auto record = std::search(bytes.begin(), bytes.end(), central.begin(), central.end());
        for (int field = 0; field < 3; ++field) {
            record[28 + 2 * field] = static_cast<unsigned char>(lengths[field]);
            record[29 + 2 * field] = static_cast<unsigned char>(lengths[field] >> 8);
        }
        clearLog();
        boost::shared_ptr<CountingStream> stream =
            boost::make_shared<CountingStream>(bytes.data(), static_cast<int>(bytes.size()));
        EXPECT_FALSE(boost::make_shared<ZipFile>()->init(stream, nullptr)) << lengths[1];
        expectAssertion("false");
        EXPECT_EQ(1u, logLines().size()) << lengths[1];
        EXPECT_EQ(1, countLogLines("ZipFile: directory record 1 of 2 is damaged")) << lengths[1];
        EXPECT_LE(stream->calls, intactStream->calls) << lengths[1];
    }
}
