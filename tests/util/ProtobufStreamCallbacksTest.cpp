#include <google/protobuf/io/zero_copy_stream_impl_lite.h>
#include <google/protobuf/util/delimited_message_util.h>

#include <string>

#include "TestPlace.pb.h"
#include "io/ByteArrayInputStream.h"
#include "io/ByteArrayOutputStream.h"
#include "io/zip/GzipInputStream.h"
#include "io/zip/GzipOutputStream.h"
#include "support/PalTest.h"
#include "util/ProtobufStreamCallbacks.h"

using Util::ProtobufStreamCallbacks;

namespace {

mapcore::test::TestPlace samplePlace(const std::string& name) {
    mapcore::test::TestPlace place;
    place.set_name(name);
    place.set_zoom(14);
    place.add_coordinates(52.52);
    place.add_coordinates(13.405);
    place.set_payload(std::string(3000, '\x07'));
    return place;
}

class ProtobufStreamCallbacksTest : public PalTest {
protected:
    const std::string bytes = "0123456789";
    IO::ByteArrayInputStream source{bytes.data(), static_cast<int>(bytes.size())};
    const void* data = nullptr;
    int size = 0;

    std::string piece() const { return std::string(static_cast<const char*>(data), size); }
};

}  // namespace

TEST_F(ProtobufStreamCallbacksTest, NextHandsOutTheWholeRemainderOnceAndBackUpReturnsItsTail) {
    ProtobufStreamCallbacks adapter(&source);
    EXPECT_EQ(0, source.available());
    ASSERT_TRUE(adapter.Next(&data, &size));
    EXPECT_EQ(bytes, piece());
    EXPECT_EQ(10, adapter.ByteCount());
    adapter.BackUp(4);
    EXPECT_EQ(6, adapter.ByteCount());
    ASSERT_TRUE(adapter.Next(&data, &size));
    EXPECT_EQ("6789", piece());
    EXPECT_FALSE(adapter.Next(&data, &size));
}

TEST_F(ProtobufStreamCallbacksTest, SkipMovesWithinTheDataAndConsumesEverythingPastItsEnd) {
    ProtobufStreamCallbacks adapter(&source);
    EXPECT_TRUE(adapter.Skip(3));
    EXPECT_EQ(3, adapter.ByteCount());
    ASSERT_TRUE(adapter.Next(&data, &size));
    EXPECT_EQ("3456789", piece());
    adapter.BackUp(7);
    EXPECT_TRUE(adapter.Skip(7));
    EXPECT_FALSE(adapter.Next(&data, &size));

    source.seek(0, KD_SEEK_SET);
    ProtobufStreamCallbacks other(&source);
    EXPECT_EQ(0, other.ByteCount());
    EXPECT_FALSE(other.Skip(11));
    EXPECT_EQ(10, other.ByteCount());
}

TEST_F(ProtobufStreamCallbacksTest, MisuseIsAProgrammingErrorThatMovesNothing) {
    ProtobufStreamCallbacks adapter(&source);
    adapter.BackUp(1);
    expectAssertion("lastReturnedSize != 0");
    expectAssertion("count <= lastReturnedSize");
    EXPECT_EQ(0, adapter.ByteCount());

    ASSERT_TRUE(adapter.Next(&data, &size));
    adapter.BackUp(11);
    expectAssertion("count <= lastReturnedSize");
    EXPECT_EQ(10, adapter.ByteCount());

    adapter.BackUp(1);
    expectAssertion("lastReturnedSize != 0");
    expectAssertion("count <= lastReturnedSize");
    EXPECT_EQ(10, adapter.ByteCount()) << "a skip or second back-up ends the right to back up";

    EXPECT_TRUE(adapter.Skip(0));
    expectAssertion("count > 0");
    EXPECT_FALSE(adapter.Next(nullptr, &size));
    expectAssertion("data");
}

TEST_F(ProtobufStreamCallbacksTest, ParsesARealMessageButNotATruncatedOne) {
    const std::string wire = samplePlace("Berlin").SerializeAsString();
    IO::ByteArrayInputStream stream(wire.data(), static_cast<int>(wire.size()));
    ProtobufStreamCallbacks adapter(&stream);
    mapcore::test::TestPlace parsed;
    ASSERT_TRUE(parsed.ParseFromZeroCopyStream(&adapter));
    EXPECT_EQ("Berlin", parsed.name());
    EXPECT_EQ(14, parsed.zoom());
    ASSERT_EQ(2, parsed.coordinates_size());
    EXPECT_DOUBLE_EQ(13.405, parsed.coordinates(1));
    EXPECT_EQ(3000u, parsed.payload().size());

    IO::ByteArrayInputStream truncated(wire.data(), static_cast<int>(wire.size()) - 5);
    ProtobufStreamCallbacks truncatedAdapter(&truncated);
    EXPECT_FALSE(parsed.ParseFromZeroCopyStream(&truncatedAdapter));
}

// Each reader takes the whole remainder and gives back what it did not use, so the next reader
// only sees the right bytes when BackUp works.
TEST_F(ProtobufStreamCallbacksTest, ConsecutiveReadersShareTheStreamThroughBackUp) {
    IO::ByteArrayOutputStream plain;
    {
        IO::Zip::GzipOutputStream gzip(&plain);
        std::string wire;
        for (const char* name : {"first", "second", "third"}) {
            std::string one;
            google::protobuf::io::StringOutputStream out(&one);
            ASSERT_TRUE(google::protobuf::util::SerializeDelimitedToZeroCopyStream(samplePlace(name), &out));
            wire += one;
        }
        gzip.write(wire.data(), static_cast<int>(wire.size()));
    }
    IO::ByteArrayInputStream compressed(plain.getData().data(), static_cast<int>(plain.getData().size()));
    IO::Zip::GzipInputStream stream(&compressed);
    ProtobufStreamCallbacks adapter(&stream);
    for (const char* name : {"first", "second", "third"}) {
        mapcore::test::TestPlace parsed;
        bool cleanEof = false;
        ASSERT_TRUE(google::protobuf::util::ParseDelimitedFromZeroCopyStream(&parsed, &adapter, &cleanEof));
        EXPECT_EQ(name, parsed.name());
    }
    mapcore::test::TestPlace none;
    bool cleanEof = false;
    EXPECT_FALSE(google::protobuf::util::ParseDelimitedFromZeroCopyStream(&none, &adapter, &cleanEof));
    EXPECT_TRUE(cleanEof);
}
