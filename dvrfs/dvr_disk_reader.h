// The headless reader of a recorder's disk: opens the raw device read-only,
// verifies superblock and block table, finds the current adapter, reads list
// entries, data block headers, index entries and frame payloads, and walks the
// recorded stream frame by frame. It never writes to the disk and never shows
// anything: failures land in the error register (m_errorCode, m_errorText).
//
// The playback panel derives from this class, so every operation and every
// member below is also a member of the panel.
#ifndef DVRFS_DVR_DISK_READER_H
#define DVRFS_DVR_DISK_READER_H

#include <cstdint>
#include <memory>

#include <wx/file.h>
#include <wx/string.h>

#include "catalog/record_catalog.h"
#include "dvrfs/dvr_volume.h"
#include "dvrfs/dvrfs_records.h"
#include "dvrfs/image_source.h"

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
    kErrNoFrame = 54,          // a whole turn of the data ring held no frame
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

class DvrDiskReader {
public:
    DvrDiskReader();
    virtual ~DvrDiskReader();
    DvrDiskReader(const DvrDiskReader&) = delete;
    DvrDiskReader& operator=(const DvrDiskReader&) = delete;

    // Volume open and close, superblock, queries.
    int OpenDVRFS(wxString path);
    void CloseDVRFS();
    int SuperBlockOpe(wxFile* file, char mode, void* arg);
    void Getpartition(wxFile* file);
    int Checkconfig();
    wxInt64 GetInfo(char selector);
    int Checksum(char* data, int n);
    // The checks a verified superblock's values must pass before the volume
    // uses them (table limit, block geometry); -1 with the register's code.
    int CheckSuperBlockValues();

    // Raw reads at physical offsets and logical positions.
    int HddataRead(wxFile* file, char* dest, wxUint64 offset, unsigned long length);
    int BlockRead(wxFile* file, wxInt64 position, char* dest, int length);
    int BlockShift(int block, wxInt64* result);

    // Adapter, list ring, data block headers (2, 5, 33, 35, 65) and index
    // entries and payloads ('Q', 'a').
    int BlockOpe(wxFile* file, char op, void* buffer, wxInt64 position, int count);
    int DataBlockOpe(wxFile* file, char op, void* buffer, wxInt64 block, int a, int b);

    // Stream extraction, one frame per call or a run of frames of one block.
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

    // Reader state, in the panel's field order.
    RecordCatalog* m_catalog;
    DvrVolume* m_volume;
    char m_errorText[kErrorTextSize];
    std::int32_t m_errorCode;
    wxInt64 m_streamBlock;
    std::int32_t m_streamFrame;
    wxFile* m_diskFile;
    // Where the bytes come from when the disk is a split raw or an E01
    // image; null for a device or raw image, read through m_diskFile.
    std::unique_ptr<dvrfs::ImageSource> m_imageSource;

private:
    // Error register.
    void SetError(std::int32_t code, int number);
    int Refuse(std::int32_t code, int number);  // records the failure, returns -1
    void SetErrorText(std::int32_t code, const char* format, ...)
        __attribute__((format(printf, 3, 4)));

    // Volume open.
    int LoadSuperBlock(wxFile* file);
    int LoadPrimarySuperBlock(wxFile* file);
    int LoadBackupSuperBlock(wxFile* file);
    int VerifySuperBlock();
    int VerifyBlockTable();
    int ReloadBlockTable(wxFile* file, wxUint64 superOffset);
    bool GeometryIsSound() const;
    int RefuseUnsoundGeometry();
    bool HasVolume();
    bool HasAdapter();

    // Index walk.
    int SearchAdapter(wxFile* file);
    bool AdapterRingsWithinLimits(const _HisiAdapter_t& adapter) const;
    bool AdapterSlotIsValid(const _HisiAdapter_t& slot, int number);
    int RefreshAdapter(wxFile* file, wxInt64 first, wxInt64 count);
    void SummariseListSpan(wxFile* file, wxInt64 first, wxInt64 count);
    int RefreshNewestBlockHeader(wxFile* file);
    int RefreshNewestFrame(wxFile* file);
    int DumpAdapter();
    int ReadListEntries(wxFile* file, wxInt64 index, int count, char* buffer);
    int ReadBlockHeaders(wxFile* file, wxInt64 block, int count, char* buffer);
    int ReadIndexEntries(wxFile* file, wxInt64 block, wxInt64 first, wxInt64 count, char* buffer);
    int ReadPayload(wxFile* file, wxInt64 block, int offset, int length, char* buffer);
    bool RecordSumMatches(const char* record, int size);

    // Stream extraction.
    int DeliverFrame(wxFile* file, const _HisiBlockHeader_t& block, unsigned char* payload,
                     _HisiHeader_t* header);
};

#endif
