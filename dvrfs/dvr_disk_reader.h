// The headless reader of a recorder's disk: opens the raw device read-only,
// verifies superblock and block table, finds the current adapter, reads list
// entries, data block headers, index entries and frame payloads, and walks the
// recorded stream frame by frame. It never writes to the disk and never shows
// anything: failures land in the error register (m_errorCode, m_errorText).
//
// The playback panel derives from this class, so every operation below is
// also a member of the panel; the reader's state is its own, read through
// accessors.
#ifndef DVRFS_DVR_DISK_READER_H
#define DVRFS_DVR_DISK_READER_H

#include <cstdint>
#include <memory>
#include <string>

#include <wx/file.h>
#include <wx/string.h>

#include "catalog/record_catalog.h"
#include "dvrfs/dvr_volume.h"
#include "dvrfs/dvrfs_records.h"
#include "dvrfs/image_source.h"
#include "dvrfs/volume_status.h"

// Codes of the error register.
enum DvrErrorCode : std::int32_t {
    kErrNone = 0,
    kErrSuperBlock = 33,       // superblock header fails its checks
    kErrBlockTable = 34,       // block table fails its XOR sum
    kErrTableLimit = 35,       // value at 0x0C exceeds the value at 0x24
    kErrReadRange = 36,        // negative position, or a length or buffer the read cannot take
    kErrReadBeyond = 37,       // the read reaches past the last logical block
    kErrNotReady = 38,         // no open volume, or no current adapter
    kErrGeometry = 39,         // block size, mask and shift disagree or are out of range
    kErrTableSize = 40,        // block table larger than the reader accepts
    kErrBackupSuperBlock = 41, // primary superblock damaged: the volume opened on the backup copy
    kErrBackupBlockTable = 42, // primary block table damaged: the volume opened on the backup copy
    kErrListEntry = 50,        // list entry fails its XOR sum in the list ring
    kErrBlockHeader = 52,      // data block header fails its XOR sum
    kErrIndexEntry = 53,       // index entry fails its XOR sum
    kErrNoFrame = 54,          // a whole turn of the data ring, or 4096 blocks, held no frame
    kErrListNegative = 65,
    kErrListBeyond = 66,
    kErrBlockNegative = 69,
    kErrBlockBeyond = 70,
    kErrIndexNegative = 71,
    kErrIndexBeyond = 72,
    kErrPayloadNegative = 73,
    kErrPayloadBeyond = 74,
    kErrAdapter = 81,          // the chosen adapter slot is not valid when read again
    kErrAdapterRings = 82,     // the adapter's rings are larger than the reader accepts
    kErrRingEmpty = 84,        // the data ring has no blocks to relate to
};

constexpr int kErrorTextSize = 132;

// What the reader accepts from a disk before it refuses it as damaged: enough
// for any recorder, small enough that no disk makes it allocate or walk
// without bound.
constexpr std::uint32_t kMaxBlockTableCount = 1u << 22;  // 128 MiB of block table
constexpr std::int32_t kMaxListMax = 1 << 20;            // 128 MiB of list ring
constexpr std::int32_t kMaxDataBlockMax = 1 << 22;       // 64 TiB of data ring
constexpr std::int32_t kMinBlockSizeShift = 9;           // an adapter slot fits a block
constexpr std::int32_t kMaxBlockSizeShift = 30;

namespace dvrfs {

// What a read of one list entry found.
enum class ListEntryState {
    kSound,      // the ring copy passes its sum
    kRepaired,   // the ring copy fails, the mirror copy passes
    kUnwritten,  // both copies fail and hold only zero bytes: never written
    kDamaged,    // both copies fail, or a copy cannot be read
    kRefused,    // the position lies outside the ring, or no adapter
};

}  // namespace dvrfs

class DvrDiskReader {
public:
    DvrDiskReader();
    virtual ~DvrDiskReader();
    DvrDiskReader(const DvrDiskReader&) = delete;
    DvrDiskReader& operator=(const DvrDiskReader&) = delete;

    // --- Named operations.

    // Opens `path` (bytes, as given) as a volume: the source, the superblock
    // and block table (the backup copy when the primary is damaged), the
    // configured-recorder check, the current adapter and its refresh, in
    // that order, stopping at the first stage that fails. The status says
    // where and why; Status() keeps it.
    dvrfs::VolumeStatus OpenVolume(const std::string& path);
    // The first two stages alone: the source and the superblock. 1 when the
    // volume is open on a sound copy, 0 otherwise.
    int OpenDisk(const std::string& path);
    // The first stage alone: the device or image, for reads at physical
    // offsets. 1, or 0 when it does not open.
    int OpenSource(const std::string& path);
    void CloseVolume();
    // Loads a copy of the superblock and its block table and verifies them;
    // 1, or -1 with the register's code.
    int LoadPrimarySuperBlock();
    int LoadBackupSuperBlock();
    int VerifySuperBlock();
    int VerifyBlockTable();
    // The checks a verified superblock's values must pass before the volume
    // uses them (table limit, block geometry); -1 with the register's code.
    int CheckSuperBlockValues();
    // Fills in the status's state of the copy the open did not need to read
    // (the backup, when the primary is sound); the copy in use and the
    // register stay as they were.
    void InspectSuperBlockCopies();
    // The Version of adapter slot 0, or -1 when it cannot be read.
    int ConfiguredVersion();

    // Whole-sector reads at physical offsets, reads at logical positions of
    // the block space, and the physical offset of a logical block.
    int ReadSectors(char* dest, wxUint64 offset, unsigned long length);
    int ReadLogical(wxInt64 position, char* dest, int length);
    int PhysicalBlockOffset(int block, wxInt64* result);
    // Whether the last ReadLogical got every byte from the disk: the bytes of
    // a piece that failed or ended early arrive as zeros.
    bool LastReadWhole() const { return m_lastReadWhole; }

    // The current adapter: found in its ring and brought up to date with
    // the list ring and the newest data block.
    int FindAdapter();
    int RefreshAdapter(wxInt64 first, wxInt64 count);
    int DumpAdapter();
    // Records of the rings and the data blocks, each checked by its sum.
    int ReadListEntries(wxInt64 index, int count, char* buffer);
    dvrfs::ListEntryState ReadListEntry(wxInt64 position, _HisiList_t* entry);
    int ReadBlockHeaders(wxInt64 block, int count, char* buffer);
    int ReadIndexEntries(wxInt64 block, wxInt64 first, wxInt64 count, char* buffer);
    int ReadPayload(wxInt64 block, int offset, int length, char* buffer);

    // The stream, one frame per call from the cursor, or a run of frames of
    // one block.
    int NextFrame(unsigned char* payload, _HisiHeader_t* header, const _HisiList_t& first, const _HisiList_t& last,
                  int direction);
    int ReadFrameRun(char flags, wxInt64 block, int first, int count, _HisiHeader_t* entries,
                     unsigned char* payload);
    void SetStreamCursor(wxInt64 block, std::int32_t frame);

    // --- What the reader holds.
    const dvrfs::VolumeStatus& Status() const { return m_status; }
    const DvrVolume* Volume() const { return m_volume; }
    // The current adapter; null until the adapter search succeeds.
    const _HisiAdapter_t* Adapter() const { return m_volume ? m_volume->adapter.get() : nullptr; }
    const dvrfs::ImageSource* Source() const { return m_source.get(); }
    const RecordCatalog* Catalog() const { return m_catalog; }
    std::int32_t ErrorCode() const { return m_errorCode; }
    const char* ErrorText() const { return m_errorText; }
    // Whether the register holds anything: a code or a text.
    bool HasError() const { return m_errorCode != kErrNone || m_errorText[0] != '\0'; }
    void ClearError();
    wxInt64 StreamBlock() const { return m_streamBlock; }
    std::int32_t StreamFrame() const { return m_streamFrame; }

    // --- The operation-code entry points, as the plugin calls them: each
    // forwards to a named operation. The file parameter is kept for their
    // callers; the reader reads through its own source.
    int OpenDVRFS(wxString path);
    void CloseDVRFS();
    int SuperBlockOpe(wxFile* file, char mode, void* arg);
    void Getpartition(wxFile* file);
    int Checkconfig();
    wxInt64 GetInfo(char selector);
    int Checksum(char* data, int n);
    int HddataRead(wxFile* file, char* dest, wxUint64 offset, unsigned long length);
    int BlockRead(wxFile* file, wxInt64 position, char* dest, int length);
    int BlockShift(int block, wxInt64* result);
    // Adapter, list ring, data block headers (2, 5, 33, 35, 65) and index
    // entries and payloads ('Q', 'a').
    int BlockOpe(wxFile* file, char op, void* buffer, wxInt64 position, int count);
    int DataBlockOpe(wxFile* file, char op, void* buffer, wxInt64 block, int a, int b);
    int get_stream(wxFile* file, unsigned char* payload, _HisiHeader_t* header,
                   _HisiList_t first, _HisiList_t last, int direction);
    int StreamRead(wxFile* file, char flags, wxInt64 block, int first, int count,
                   _HisiHeader_t* entries, unsigned char* payload);

    // Byte-order hooks: the disk is little-endian like every host this runs
    // on, so each of them leaves its record as it is.
    void Endian_SuperBlock(_H264SuperBlock_t*) {}
    void Endian_BlockTable(_H264BlockTable_t*) {}
    void Endian_Header(_HisiHeader_t*) {}
    void Endian_Link(_HisiLink_t*) {}
    void Endian_List(_HisiList_t*) {}
    void Endian_EventList(_H264EventList_t*) {}
    void Endian_Adapter(_HisiAdapter_t*) {}
    void EndianTrans_16(void*) {}
    void EndianTrans_32(void*) {}
    void EndianTrans_64(void*) {}

protected:
    // The catalogue buffer, allocated by the first open and kept until
    // ReleaseCatalog: the catalogue build fills it.
    RecordCatalog* MutableCatalog() { return m_catalog; }
    void ReleaseCatalog();
    // The adapter in memory, for a build that must see a disk's own values.
    _HisiAdapter_t* MutableAdapter() { return m_volume ? m_volume->adapter.get() : nullptr; }

private:
    // Error register.
    void SetError(std::int32_t code, int number);
    int Refuse(std::int32_t code, int number);  // records the failure, returns -1
    void SetErrorText(std::int32_t code, int number, const char* format, ...)
        __attribute__((format(printf, 4, 5)));
    void RecordFailure(dvrfs::OpenStage stage);

    // Volume open.
    void PrepareVolume();
    int LoadSuperBlock();
    dvrfs::CopyState LoadCopy(bool backup);
    dvrfs::CopyState StateOfFailedCopy() const;
    void NoteClaimedSize();
    int ReloadBlockTable(wxUint64 superOffset);
    bool GeometryIsSound() const;
    int RefuseUnsoundGeometry();
    bool HasVolume();
    bool HasAdapter();

    // Index walk.
    bool AdapterRingsWithinLimits(const _HisiAdapter_t& adapter) const;
    bool AdapterSlotIsValid(const _HisiAdapter_t& slot, int number);
    void SummariseListSpan(wxInt64 first, wxInt64 count);
    int RefreshNewestBlockHeader();
    int RefreshNewestFrame();
    bool ListRunInRing(wxInt64 index, wxInt64 count);
    dvrfs::ListEntryState RepairFromMirror(wxInt64 position, char* entry, bool ringWhole);
    bool RecordSumMatches(const char* record, int size);

    // Stream extraction.
    int DeliverFrame(const _HisiBlockHeader_t& block, unsigned char* payload, _HisiHeader_t* header);

    // Reader state, in the panel's field order.
    RecordCatalog* m_catalog;
    DvrVolume* m_volume;
    char m_errorText[kErrorTextSize];
    std::int32_t m_errorCode;
    int m_errorPlace;  // the number the text names
    wxInt64 m_streamBlock;
    std::int32_t m_streamFrame;
    // Where the bytes come from: a device, a raw, split raw or E01 image.
    std::unique_ptr<dvrfs::ImageSource> m_source;
    dvrfs::VolumeStatus m_status;
    bool m_lastReadWhole = true;
};

#endif
