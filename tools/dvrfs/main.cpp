// dvrfs: looks at a recorder's disk without the host application.
#include <cstdio>
#include <cstring>
#include <string>

#include "dvrfs/dvr_disk_reader.h"

namespace {

const char kUsage[] = R"(Usage: dvrfs info DISK [--dump]
Open a recorder's disk (a device or an image file) read-only, verify it and
print what its superblock and current adapter say, one key=value a line.
  --dump    also print the reader's adapter dump

Exit status: 0 success, 1 the disk cannot be opened or read as a recorder
disk, 2 usage error.
)";

const char* PlainWords(std::int32_t code)
{
    switch (code) {
    case kErrNone: return "the disk cannot be opened";
    case kErrSuperBlock: return "the superblock is damaged";
    case kErrBlockTable: return "the block table is damaged";
    case kErrTableLimit: return "the superblock is inconsistent";
    case kErrGeometry: return "the superblock's block size is inconsistent";
    case kErrTableSize: return "the block table is too large";
    case kErrReadRange:
    case kErrReadBeyond: return "a record lies outside the disk";
    case kErrAdapter: return "no valid state record was found";
    case kErrAdapterRings: return "the state record describes rings that do not fit the disk";
    case kErrListSpan: return "the state record's list of recordings is inconsistent";
    case kErrListEntry:
    case kErrListNegative:
    case kErrListBeyond: return "a recording entry is damaged";
    case kErrBlockHeader:
    case kErrBlockNegative:
    case kErrBlockBeyond: return "a data block header is damaged";
    case kErrIndexEntry:
    case kErrIndexNegative:
    case kErrIndexBeyond: return "a frame index entry is damaged";
    default: return "the disk is damaged";
    }
}

int CannotRead(const char* disk, const char* what, const DvrDiskReader& reader)
{
    std::fprintf(stderr, "dvrfs: %s: %s: %s (code %d%s%s)\n", disk, what, PlainWords(reader.m_errorCode),
                 reader.m_errorCode, reader.m_errorText[0] ? ": " : "", reader.m_errorText);
    return 1;
}

int Info(const char* disk, bool dump)
{
    DvrDiskReader reader;
    if (reader.OpenDVRFS(wxString::FromUTF8(disk)) <= 0)
        return CannotRead(disk, "not a recorder disk", reader);
    const _H264SuperBlock_t& super = reader.m_volume->superBlock;
    std::printf("magic=0x%04X\n", super.Magic);
    std::printf("header_size=%u\n", super.HeaderSize);
    std::printf("block_size=%d\n", super.BlockSize);
    std::printf("block_count=%d\n", super.BlockCount);
    std::printf("block_table_count=%u\n", super.BlockTableCount);
    std::printf("offset_block_space=%llu\n", static_cast<unsigned long long>(super.OffsetBlockSpace));
    std::printf("super_offset=%llu\n", static_cast<unsigned long long>(super.SuperOffset));
    std::printf("super_offset_backup=%llu\n", static_cast<unsigned long long>(super.SuperOffsetBackup));

    const int version = reader.Checkconfig();
    if (version <= 0) {
        std::fflush(stdout);
        std::fprintf(stderr, "dvrfs: %s: the recorder was never configured on this disk (version %d)\n", disk,
                     version);
        return 1;
    }
    if (reader.BlockOpe(reader.m_diskFile, 2, nullptr, 0, 0) < 0 && !reader.m_volume->adapter) {
        std::fflush(stdout);
        return CannotRead(disk, "no current state record", reader);
    }
    const _HisiAdapter_t& adapter = *reader.m_volume->adapter;
    std::printf("adapter_slot=%d\n", adapter.Idx);
    std::printf("adapter_version=%d\n", adapter.Version);
    std::printf("list_max=%d\n", adapter.ListMax);
    std::printf("data_block_max=%d\n", adapter.DataBlockMax);
    std::printf("first_list=%d\n", adapter.FirstList.Idx);
    std::printf("last_list=%d\n", adapter.LastList.Idx);
    std::printf("record_sum=%u\n", adapter.RecordSum);
    std::printf("start_time=%u\n", adapter.StartTime);
    std::printf("end_time=%u\n", adapter.EndTime);
    for (char selector : {1, 3, 17, 19, 33, 35, 49, 50})
        std::printf("info_%d=%lld\n", selector, static_cast<long long>(reader.GetInfo(selector)));
    std::fflush(stdout);
    if (dump)
        reader.BlockOpe(reader.m_diskFile, 5, nullptr, 0, 0);
    return 0;
}

}  // namespace

int main(int argc, char** argv)
{
    if (argc >= 2 && (!std::strcmp(argv[1], "--help") || !std::strcmp(argv[1], "-h"))) {
        std::fputs(kUsage, stdout);
        return 0;
    }
    if (argc >= 3 && !std::strcmp(argv[1], "info")) {
        const bool dump = argc == 4 && !std::strcmp(argv[3], "--dump");
        if (argc == 3 || dump)
            return Info(argv[2], dump);
    }
    std::fputs(kUsage, stderr);
    return 2;
}
