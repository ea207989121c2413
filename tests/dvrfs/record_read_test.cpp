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
using dvrimage::Target;

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

// Each operation code forwards to its named operation: on two readers of
// the same disk, the two give the same result, the same bytes, the same
// register and the same stream cursor.
TEST_F(RecordReadTest, EachOperationCodeDoesWhatItsNamedOperationDoes)
{
    image_->Damage(Target::ListEntry, 1);
    image_->Damage(Target::BlockHeader, 3);
    Refingerprint(path_);
    using Op = std::function<int(TestReader&, char*)>;
    _HisiList_t first{};  // the oldest and the newest recording, as the stream walk needs them
    first.EndBlock = 1;
    _HisiList_t last{};
    last.Idx = 15;
    last.StartBlock = 6;
    last.EndBlock = 7;
    auto header = [](char* b) { return reinterpret_cast<_HisiHeader_t*>(b); };
    auto payload = [](char* b) { return reinterpret_cast<unsigned char*>(b + 64); };
    const struct {
        const char* name;
        Op code;
        Op named;
    } cases[] = {
        {"load primary", [](TestReader& r, char*) { return r.SuperBlockOpe(nullptr, 3, nullptr); },
         [](TestReader& r, char*) { return r.LoadPrimarySuperBlock(); }},
        {"load backup", [](TestReader& r, char*) { return r.SuperBlockOpe(nullptr, 5, nullptr); },
         [](TestReader& r, char*) { return r.LoadBackupSuperBlock(); }},
        {"verify superblock", [](TestReader& r, char*) { return r.SuperBlockOpe(nullptr, 6, nullptr); },
         [](TestReader& r, char*) { return r.VerifySuperBlock(); }},
        {"verify table", [](TestReader& r, char*) { return r.SuperBlockOpe(nullptr, 7, nullptr); },
         [](TestReader& r, char*) { return r.VerifyBlockTable(); }},
        {"configured version", [](TestReader& r, char*) { return r.Checkconfig(); },
         [](TestReader& r, char*) { return r.ConfiguredVersion(); }},
        {"sectors", [](TestReader& r, char* b) { return r.HddataRead(nullptr, b, 700, 900); },
         [](TestReader& r, char* b) { return r.ReadSectors(b, 700, 900); }},
        {"logical", [](TestReader& r, char* b) { return r.BlockRead(nullptr, 4090, b, 900); },
         [](TestReader& r, char* b) { return r.ReadLogical(4090, b, 900); }},
        {"block offset", [](TestReader& r, char* b) { return r.BlockShift(1000, reinterpret_cast<wxInt64*>(b)); },
         [](TestReader& r, char* b) { return r.PhysicalBlockOffset(1000, reinterpret_cast<wxInt64*>(b)); }},
        {"adapter search", [](TestReader& r, char*) { return r.BlockOpe(nullptr, 2, nullptr, 0, 0); },
         [](TestReader& r, char*) { return r.FindAdapter(); }},
        {"refresh", [](TestReader& r, char*) { return r.BlockOpe(nullptr, 35, nullptr, 0, 3); },
         [](TestReader& r, char*) { return r.RefreshAdapter(0, 3); }},
        {"list entries repaired", [](TestReader& r, char* b) { return r.BlockOpe(nullptr, 33, b, 0, 3); },
         [](TestReader& r, char* b) { return r.ReadListEntries(0, 3, b); }},
        {"list entry unwritten", [](TestReader& r, char* b) { return r.BlockOpe(nullptr, 33, b, 3, 1); },
         [](TestReader& r, char* b) { return r.ReadListEntries(3, 1, b); }},
        {"headers", [](TestReader& r, char* b) { return r.BlockOpe(nullptr, 65, b, 0, 3); },
         [](TestReader& r, char* b) { return r.ReadBlockHeaders(0, 3, b); }},
        {"damaged header", [](TestReader& r, char* b) { return r.BlockOpe(nullptr, 65, b, 3, 1); },
         [](TestReader& r, char* b) { return r.ReadBlockHeaders(3, 1, b); }},
        {"index entries", [](TestReader& r, char* b) { return r.DataBlockOpe(nullptr, 'Q', b, 4, 0, 3); },
         [](TestReader& r, char* b) { return r.ReadIndexEntries(4, 0, 3, b); }},
        {"payload", [](TestReader& r, char* b) { return r.DataBlockOpe(nullptr, 'a', b, 4, 500, 1500); },
         [](TestReader& r, char* b) { return r.ReadPayload(4, 500, 1500, b); }},
        {"next frame forward",
         [&](TestReader& r, char* b) { return r.get_stream(nullptr, payload(b), header(b), first, last, 1); },
         [&](TestReader& r, char* b) { return r.NextFrame(payload(b), header(b), first, last, 1); }},
        {"next frame backward",
         [&](TestReader& r, char* b) { return r.get_stream(nullptr, payload(b), header(b), first, last, 0); },
         [&](TestReader& r, char* b) { return r.NextFrame(payload(b), header(b), first, last, 0); }},
        {"frame run",
         [&](TestReader& r, char* b) { return r.StreamRead(nullptr, 3, 4, 0, 3, header(b), payload(b)); },
         [&](TestReader& r, char* b) { return r.ReadFrameRun(3, 4, 0, 3, header(b), payload(b)); }},
        {"open", [&](TestReader& r, char*) { return r.OpenDVRFS(wxString(path_)); },
         [&](TestReader& r, char*) { return r.OpenDisk(path_); }},
    };
    for (const auto& c : cases) {
        TestReader byCode;
        TestReader byName;
        std::vector<char> codeBytes(8192, 0x5A);
        std::vector<char> nameBytes(8192, 0x5A);
        for (TestReader* r : {&byCode, &byName}) {
            ASSERT_TRUE(r->OpenVolume(path_).Ready());
            r->ClearError();
            r->SetStreamCursor(4, 2);
        }
        EXPECT_EQ(c.code(byCode, codeBytes.data()), c.named(byName, nameBytes.data())) << c.name;
        EXPECT_EQ(codeBytes, nameBytes) << c.name;
        EXPECT_EQ(byCode.ErrorCode(), byName.ErrorCode()) << c.name;
        EXPECT_STREQ(byCode.ErrorText(), byName.ErrorText()) << c.name;
        EXPECT_EQ(byCode.StreamBlock(), byName.StreamBlock()) << c.name;
        EXPECT_EQ(byCode.StreamFrame(), byName.StreamFrame()) << c.name;
        ASSERT_EQ(byCode.Adapter() == nullptr, byName.Adapter() == nullptr) << c.name;
        if (byCode.Adapter()) {
            EXPECT_EQ(std::memcmp(byCode.Adapter(), byName.Adapter(), sizeof(_HisiAdapter_t)), 0) << c.name;
        }
    }
}

}  // namespace
