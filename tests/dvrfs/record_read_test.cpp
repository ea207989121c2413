// Reading list entries, data block headers, index entries and payloads: the
// bounds of each, where the last index entry lies, and the adapter they need.
#include <climits>
#include <cstring>
#include <functional>
#include <vector>

#include "tests/support/disk_fixture.h"
#include "tests/support/io_trace.h"

namespace {

using dvrimage::GeneratedRecording;

// Recordings at list positions 0, 1, 2 and 15 (the last of the ring of 16);
// the last one fills data block 7, the last of the ring of 8.
class RecordReadTest : public DiskTest {
protected:
    void SetUp() override
    {
        DiskTest::SetUp();
        path_ = WriteDisk(SmallLayout(), {GeneratedRecording(0, 0, 1, 100, 200, 8, 3, 1000),
                                          GeneratedRecording(1, 2, 3, 300, 400, 8, 3, 1000),
                                          GeneratedRecording(2, 4, 5, 500, 600, 8, 3, 1000),
                                          GeneratedRecording(15, 6, 7, 700, 800, 8, 3, 1000)});
    }

    void Search()
    {
        ASSERT_EQ(OpenAndSearch(path_), 1);
        reader_.ClearError();
    }

    int ReadList(wxInt64 index, int count, void* buffer)
    {
        return reader_.BlockOpe(nullptr, 33, buffer, index, count);
    }
    int ReadHeaders(wxInt64 block, int count, void* buffer)
    {
        return reader_.BlockOpe(nullptr, 65, buffer, block, count);
    }
    int ReadIndex(wxInt64 block, int first, int count, void* buffer)
    {
        return reader_.DataBlockOpe(nullptr, 'Q', buffer, block, first, count);
    }
    int ReadPayload(wxInt64 block, int offset, int length, void* buffer)
    {
        return reader_.DataBlockOpe(nullptr, 'a', buffer, block, offset, length);
    }
    std::string path_;
};

TEST_F(RecordReadTest, ReadsOutsideTheirRingOrAreaAreRefusedWithCodeAndText)
{
    Search();
    char b[3 * 128];
    auto Widen = [this] { reader_.MutableAdapter()->DataBlockMax = 1000; };
    const struct {
        const char* what;
        std::function<int()> read;
        std::int32_t code;
        const char* text;
    } refused[] = {
        {"list entry past the ring", [&] { return ReadList(16, 1, b); }, 66, "FUNCTION[1445]"},
        {"list entries across the end", [&] { return ReadList(14, 3, b); }, 66, "FUNCTION[1445]"},
        {"negative list entry", [&] { return ReadList(-1, 1, b); }, 65, "FUNCTION[1438]"},
        // Never written: it fails its sum in the ring and the mirror.
        {"unwritten list entry", [&] { return ReadList(3, 1, b); }, 50, "FUNCTION[1463]"},
        {"header past the ring", [&] { return ReadHeaders(8, 1, b); }, 70, "FUNCTION[1583]"},
        {"header far past the ring", [&] { return ReadHeaders(INT64_MAX, 1, b); }, 70, "FUNCTION[1583]"},
        {"negative header", [&] { return ReadHeaders(-1, 1, b); }, 69, "FUNCTION[1576]"},
        {"negative index entry", [&] { return ReadIndex(4, -1, 1, b); }, 71, "FUNCTION[1623]"},
        {"index entry past the block", [&] { return ReadIndex(4, 262142, 1, b); }, 72, "FUNCTION[1630]"},
        {"payload past the area", [&] { return ReadPayload(5, 16777000, 89, b); }, 74, "FUNCTION[1666]"},
        {"negative payload length", [&] { return ReadPayload(5, 10, -20, b); }, 74, "FUNCTION[1666]"},
        {"payload overflowing", [&] { return ReadPayload(5, INT_MAX, INT_MAX, b); }, 74, "FUNCTION[1666]"},
        {"negative payload offset", [&] { return ReadPayload(5, -1, 10, b); }, 73, "FUNCTION[1661]"},
        // A data ring the adapter claims beyond the end of the block space.
        {"header beyond the disk", [&] { Widen(); return ReadHeaders(900, 1, b); }, 37, "FUNCTION[1150]Pos="},
        {"index entry beyond the disk", [&] { return ReadIndex(900, 0, 2, b); }, 37, "FUNCTION[1150]Pos="},
        {"payload beyond the disk", [&] { return ReadPayload(900, 0, 128, b); }, 37, "FUNCTION[1150]Pos="},
    };
    for (const auto& r : refused) {
        EXPECT_EQ(r.read(), -1) << r.what;
        EXPECT_EQ(reader_.ErrorCode(), r.code) << r.what;
        EXPECT_EQ(ErrorText().substr(0, std::strlen(r.text)), r.text) << r.what;
    }
}

TEST_F(RecordReadTest, LastIndexEntryLiesDirectlyAfterTheHeader)
{
    const dvrimage::IndexEntryBytes last = image_->MakeIndexEntry(12345, 678);
    image_->WriteLogical(image_->PayloadPosition(4, 0), last.data(), last.size());  // block offsets 128 to 191
    Refingerprint(path_);
    Search();
    iotrace::Reset();

    _HisiHeader_t entry;
    ASSERT_EQ(ReadIndex(4, 262141, 1, &entry), 1);
    EXPECT_EQ(entry.DataOffset, 12345);
    EXPECT_EQ(entry.DataSize, 678);
    const std::vector<iotrace::ReadCall> reads = iotrace::Reads(path_);
    ASSERT_EQ(reads.size(), 1u);
    EXPECT_EQ(reads[0].offset, static_cast<std::int64_t>(image_->PhysicalOffset(image_->DataBlockOffset() +
                                                                                  4 * (1 << 24))));
}

TEST_F(RecordReadTest, OperationsNeedAnAdapterAndIgnoreUnknownCodes)
{
    ASSERT_EQ(Open(path_), 1);
    char buffer[128];
    EXPECT_EQ(ReadList(0, 1, buffer), -1);
    EXPECT_EQ(reader_.ErrorCode(), 38);
    EXPECT_EQ(ErrorText(), "FUNCTION[1130]");
    EXPECT_EQ(ReadHeaders(0, 1, buffer), -1);
    EXPECT_EQ(ReadIndex(0, 0, 1, buffer), -1);
    EXPECT_EQ(ReadPayload(0, 0, 1, buffer), -1);
    EXPECT_EQ(reader_.BlockOpe(nullptr, 35, nullptr, 0, 1), -1);
    EXPECT_EQ(reader_.BlockOpe(nullptr, 'x', buffer, 0, 1), 1);
    EXPECT_EQ(reader_.DataBlockOpe(nullptr, 'x', buffer, 0, 0, 1), 1);
}

}  // namespace
