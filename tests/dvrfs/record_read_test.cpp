// Reading list entries (with the mirror repair), data block headers, index
// entries and payloads, each with its bounds and XOR-sum checks.
#include <climits>
#include <cstring>
#include <vector>

#include "tests/support/disk_fixture.h"
#include "tests/support/io_trace.h"

namespace {

using dvrimage::DiskImage;
using dvrimage::GeneratedRecording;
using dvrimage::Target;

// Recordings at list positions 0, 1, 2 and 15 (the last of the ring of 16);
// the last one fills data block 7, the last of the ring of 8.
class RecordReadTest : public DiskTest {
protected:
    void SetUp() override
    {
        DiskTest::SetUp();
        image_ = std::make_unique<DiskImage>(SmallLayout());
        image_->Add(GeneratedRecording(0, 0, 1, 100, 200, 8, 3, 1000));
        image_->Add(GeneratedRecording(1, 2, 3, 300, 400, 8, 3, 1000));
        image_->Add(GeneratedRecording(2, 4, 5, 500, 600, 8, 3, 1000));
        image_->Add(GeneratedRecording(15, 6, 7, 700, 800, 8, 3, 1000));
        path_ = WriteImage(*image_);
    }

    void Search()
    {
        ASSERT_EQ(OpenAndSearch(path_), 1);
        reader_.m_errorCode = 0;
        reader_.m_errorText[0] = '\0';
    }

    int ReadList(wxInt64 index, int count, void* buffer)
    {
        return reader_.BlockOpe(reader_.m_diskFile, 33, buffer, index, count);
    }
    int ReadHeaders(wxInt64 block, int count, void* buffer)
    {
        return reader_.BlockOpe(reader_.m_diskFile, 65, buffer, block, count);
    }
    int ReadIndex(wxInt64 block, int first, int count, void* buffer)
    {
        return reader_.DataBlockOpe(reader_.m_diskFile, 'Q', buffer, block, first, count);
    }
    int ReadPayload(wxInt64 block, int offset, int length, void* buffer)
    {
        return reader_.DataBlockOpe(reader_.m_diskFile, 'a', buffer, block, offset, length);
    }
    void ExpectError(std::int32_t code, const char* text)
    {
        EXPECT_EQ(reader_.m_errorCode, code);
        EXPECT_EQ(ErrorText(), text);
    }

    std::unique_ptr<DiskImage> image_;
    std::string path_;
};

TEST_F(RecordReadTest, ListReadDeliversEntriesWithinTheRing)
{
    Search();
    _HisiList_t entries[3];
    ASSERT_EQ(ReadList(0, 3, entries), 1);
    EXPECT_EQ(entries[0].Idx, 0);
    EXPECT_EQ(entries[1].StartBlock, 2);
    EXPECT_EQ(entries[2].EndTime, 600u);
    ASSERT_EQ(ReadList(15, 1, entries), 1);
    EXPECT_EQ(entries[0].Idx, 15);

    EXPECT_EQ(ReadList(16, 1, entries), -1);
    ExpectError(66, "FUNCTION[1445]");
    EXPECT_EQ(ReadList(14, 3, entries), -1);
    ExpectError(66, "FUNCTION[1445]");
    EXPECT_EQ(ReadList(-1, 1, entries), -1);
    ExpectError(65, "FUNCTION[1438]");
    EXPECT_EQ(ReadList(3, 1, entries), -1);  // never written: fails its sum in the ring and the mirror
    ExpectError(50, "FUNCTION[1463]");
}

TEST_F(RecordReadTest, DamagedRingCopyIsRepairedFromTheMirrorAndCode50Stays)
{
    image_->Damage(Target::ListEntry, 1);
    Refingerprint(path_);
    Search();
    iotrace::Reset();

    _HisiList_t entries[3];
    ASSERT_EQ(ReadList(0, 3, entries), 1);
    EXPECT_EQ(entries[1].Idx, 1);
    EXPECT_EQ(entries[1].StartBlock, 2);
    EXPECT_EQ(reader_.Checksum(reinterpret_cast<char*>(&entries[1]), 128), 0x5A);
    ExpectError(50, "FUNCTION[1463]");
    // One read of the three entries in the ring, one of entry 1 in the mirror.
    const std::vector<iotrace::ReadCall> reads = iotrace::Reads(path_);
    ASSERT_EQ(reads.size(), 2u);
    EXPECT_EQ(reads[1].offset, static_cast<std::int64_t>(image_->PhysicalOffset(image_->ListOffsetBackup())));
}

TEST_F(RecordReadTest, EntryDamagedInBothCopiesFails)
{
    image_->Damage(Target::ListEntry, 2);
    image_->Damage(Target::ListMirror, 2);
    Refingerprint(path_);
    Search();
    _HisiList_t entry;
    EXPECT_EQ(ReadList(2, 1, &entry), -1);
    ExpectError(50, "FUNCTION[1463]");
}

TEST_F(RecordReadTest, DamagedMirrorAloneIsNeverRead)
{
    image_->Damage(Target::ListMirror, 0);
    Refingerprint(path_);
    Search();
    _HisiList_t entry;
    EXPECT_EQ(ReadList(0, 1, &entry), 1);
    EXPECT_EQ(reader_.m_errorCode, 0);
}

TEST_F(RecordReadTest, HeaderReadStaysInsideTheDataRing)
{
    Search();
    _HisiBlockHeader_t headers[2];
    ASSERT_EQ(ReadHeaders(6, 2, headers), 1);
    EXPECT_EQ(headers[0].BlockIdx, 6);
    EXPECT_EQ(headers[1].BlockIdx, 7);
    EXPECT_EQ(headers[1].FrameCount, 3);

    EXPECT_EQ(ReadHeaders(8, 1, headers), -1);
    ExpectError(70, "FUNCTION[1583]");
    EXPECT_EQ(ReadHeaders(INT64_MAX, 1, headers), -1);
    ExpectError(70, "FUNCTION[1583]");
    EXPECT_EQ(ReadHeaders(-1, 1, headers), -1);
    ExpectError(69, "FUNCTION[1576]");

    image_->Damage(Target::BlockHeader, 3);
    EXPECT_EQ(ReadHeaders(3, 1, headers), -1);
    ExpectError(52, "FUNCTION[1600]");
    Refingerprint(path_);
}

TEST_F(RecordReadTest, IndexEntriesComeNewestFirstFromTheEndOfTheBlock)
{
    Search();
    _HisiHeader_t entries[3];
    ASSERT_EQ(ReadIndex(4, 0, 3, entries), 1);
    EXPECT_EQ(entries[0].DataOffset, 2000);
    EXPECT_EQ(entries[1].DataOffset, 1000);
    EXPECT_EQ(entries[2].DataOffset, 0);
    EXPECT_EQ(entries[2].DataSize, 1000);

    EXPECT_EQ(ReadIndex(4, -1, 1, entries), -1);
    ExpectError(71, "FUNCTION[1623]");
    EXPECT_EQ(ReadIndex(4, 262142, 1, entries), -1);
    ExpectError(72, "FUNCTION[1630]");
    image_->Damage(Target::IndexEntry, 4, 1);
    EXPECT_EQ(ReadIndex(4, 0, 3, entries), -1);
    ExpectError(53, "FUNCTION[1649]");
    Refingerprint(path_);
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

TEST_F(RecordReadTest, PayloadReadStaysInsideThePayloadArea)
{
    Search();
    std::vector<unsigned char> payload(1000);
    ASSERT_EQ(ReadPayload(5, 1000, 1000, payload.data()), 1);
    EXPECT_EQ(payload, dvrimage::PatternPayload(5, 1, 1000));

    EXPECT_EQ(ReadPayload(5, 16777000, 88, payload.data()), 1);
    EXPECT_EQ(ReadPayload(5, 16777000, 89, payload.data()), -1);
    ExpectError(74, "FUNCTION[1666]");
    EXPECT_EQ(ReadPayload(5, 10, -20, payload.data()), -1);
    ExpectError(74, "FUNCTION[1666]");
    EXPECT_EQ(ReadPayload(5, INT_MAX, INT_MAX, payload.data()), -1);
    ExpectError(74, "FUNCTION[1666]");
    EXPECT_EQ(ReadPayload(5, -1, 10, payload.data()), -1);
    ExpectError(73, "FUNCTION[1661]");
}

// A read refused before the device is asked (here: a data block the adapter
// claims beyond the end of the block space) leaves the caller's record as it
// was, so an adapter field keeps its value when the refresh cannot read.
TEST_F(RecordReadTest, ReadRefusedBeforeTheDeviceLeavesTheBufferAsItWas)
{
    Search();
    reader_.m_volume->adapter->DataBlockMax = 1000;
    const std::int64_t beyond = 900;
    std::vector<char> buffer(128, '\x5A');
    const std::vector<char> before = buffer;
    iotrace::Reset();
    EXPECT_EQ(ReadHeaders(beyond, 1, buffer.data()), -1);
    EXPECT_EQ(ReadIndex(beyond, 0, 2, buffer.data()), -1);
    EXPECT_EQ(ReadPayload(beyond, 0, 128, buffer.data()), -1);
    EXPECT_EQ(reader_.m_errorCode, 37);
    EXPECT_EQ(buffer, before);
    EXPECT_TRUE(iotrace::Reads(path_).empty());
}

TEST_F(RecordReadTest, OperationsNeedAnAdapterAndIgnoreUnknownCodes)
{
    ASSERT_EQ(Open(path_), 1);
    char buffer[128];
    EXPECT_EQ(ReadList(0, 1, buffer), -1);
    ExpectError(38, "FUNCTION[1130]");
    EXPECT_EQ(ReadHeaders(0, 1, buffer), -1);
    EXPECT_EQ(ReadIndex(0, 0, 1, buffer), -1);
    EXPECT_EQ(ReadPayload(0, 0, 1, buffer), -1);
    EXPECT_EQ(reader_.BlockOpe(reader_.m_diskFile, 35, nullptr, 0, 1), -1);
    EXPECT_EQ(reader_.BlockOpe(reader_.m_diskFile, 'x', buffer, 0, 1), 1);
    EXPECT_EQ(reader_.DataBlockOpe(reader_.m_diskFile, 'x', buffer, 0, 0, 1), 1);
}

}  // namespace
