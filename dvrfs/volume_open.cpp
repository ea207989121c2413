// Volume open and close, superblock and block table verification, the error
// register and the small queries on an open volume.
#include <cstdarg>
#include <cstdio>
#include <cstring>
#include <string>
#include <vector>

#include "dvrfs/dvr_disk_reader.h"
#include "dvrfs/error_places.h"

using namespace dvrfs;

DvrDiskReader::DvrDiskReader()
    : m_catalog(nullptr),
      m_volume(nullptr),
      m_errorText{},
      m_errorCode(kErrNone),
      m_errorPlace(0),
      m_streamBlock(0),
      m_streamFrame(0)
{
}

DvrDiskReader::~DvrDiskReader()
{
    CloseVolume();
    ReleaseCatalog();
}

void DvrDiskReader::ReleaseCatalog()
{
    delete m_catalog;
    m_catalog = nullptr;
}

void DvrDiskReader::SetError(std::int32_t code, int number)
{
    SetErrorText(code, number, "%s[%d]", kFunctionWord, number);
}

int DvrDiskReader::Refuse(std::int32_t code, int number)
{
    SetError(code, number);
    return -1;
}

void DvrDiskReader::SetErrorText(std::int32_t code, int number, const char* format, ...)
{
    m_errorCode = code;
    m_errorPlace = number;
    va_list args;
    va_start(args, format);
    std::vsnprintf(m_errorText, sizeof m_errorText, format, args);
    va_end(args);
}

void DvrDiskReader::ClearError()
{
    m_errorCode = kErrNone;
    m_errorPlace = 0;
    m_errorText[0] = '\0';
}

void DvrDiskReader::RecordFailure(OpenStage stage)
{
    m_status.stage = stage;
    m_status.code = m_errorCode;
    m_status.place = m_errorPlace;
    m_status.registerText = m_errorText;
}

// The volume and the catalogue, allocated by the first open and reused by
// every later one; an adapter found on the disk held so far says nothing of
// the next one.
void DvrDiskReader::PrepareVolume()
{
    if (!m_volume)
        m_volume = new DvrVolume;
    if (!m_catalog) {
        m_catalog = new RecordCatalog;
        m_catalog->Opened = 0;
        std::memset(m_catalog->Reserved, 0, sizeof m_catalog->Reserved);
        m_catalog->Opened2 = 0;
        m_catalog->SpanCount = 0;
    }
    m_volume->adapter.reset();
    m_volume->unreadableListPositions.clear();
    m_volume->unwrittenListPositions.clear();
}

VolumeStatus DvrDiskReader::OpenVolume(const std::string& path)
{
    if (OpenDisk(path) <= 0)
        return m_status;
    if (ConfiguredVersion() <= 0) {
        RecordFailure(OpenStage::kConfiguration);
        return m_status;
    }
    if (FindAdapter() < 0) {
        RecordFailure(Adapter() ? OpenStage::kRefresh : OpenStage::kAdapter);
        return m_status;
    }
    m_status.stage = OpenStage::kReady;
    return m_status;
}

int DvrDiskReader::OpenDisk(const std::string& path)
{
    PrepareVolume();
    m_status = VolumeStatus{};
    if (OpenSource(path) <= 0) {
        RecordFailure(OpenStage::kSource);
        return 0;
    }
    m_catalog->Opened = 1;
    m_catalog->Opened2 = 1;

    Getpartition(nullptr);
    if (LoadSuperBlock() < 0) {
        RecordFailure(OpenStage::kSuperBlock);
        CloseVolume();
        return 0;
    }
    m_status.copyInUse = m_volume->copyInUse;
    NoteClaimedSize();
    m_status.stage = OpenStage::kConfiguration;
    return 1;
}

int DvrDiskReader::OpenSource(const std::string& path)
{
    m_source.reset();
    SourceError error;
    m_source = OpenImageSource(path, &error);
    if (!m_source) {
        m_status.systemError = error.systemError;
        m_status.detail = error.detail;
        return 0;
    }
    m_status.sourceOpened = true;
    m_status.sourceKind = m_source->Kind();
    m_status.pieces = m_source->Pieces();
    m_status.sourceSize = m_source->Size();
    m_status.device = m_source->IsDevice();
    return 1;
}

// The size of the disk the superblock describes: its block space and the
// one physical block left out after every 512 logical ones. Known only for a
// positive block count; it saturates rather than overflow.
void DvrDiskReader::NoteClaimedSize()
{
    const _H264SuperBlock_t& super = m_volume->superBlock;
    if (super.BlockCount <= 0 || super.BlockSize <= 0)
        return;
    const std::uint64_t blocks = static_cast<std::uint64_t>(super.BlockCount) + (super.BlockCount - 1) / 512;
    std::uint64_t bytes = 0;
    if (__builtin_mul_overflow(blocks, static_cast<std::uint64_t>(super.BlockSize), &bytes) ||
        __builtin_add_overflow(bytes, static_cast<std::uint64_t>(super.OffsetBlockSpace), &bytes))
        bytes = UINT64_MAX;
    m_status.claimedSize = bytes;
}

// The primary copy when it is sound, else the backup copy when that is: the
// backup exists so that one damaged sector does not lose the disk. The
// register then says which part of the primary copy was damaged.
int DvrDiskReader::LoadSuperBlock()
{
    m_volume->copyInUse = SuperBlockCopy::kPrimary;
    m_status.primary = LoadCopy(false);
    if (m_status.primary == CopyState::kSound)
        return 1;
    m_status.backup = LoadCopy(true);
    if (m_status.backup != CopyState::kSound)
        return -1;
    if (m_status.primary == CopyState::kTableDamaged) {
        m_volume->copyInUse = SuperBlockCopy::kBackupTable;
        SetError(kErrBackupBlockTable, kAtBackupBlockTable);
    } else {
        m_volume->copyInUse = SuperBlockCopy::kBackupSuperBlock;
        SetError(kErrBackupSuperBlock, kAtBackupSuperBlock);
    }
    return 1;
}

CopyState DvrDiskReader::LoadCopy(bool backup)
{
    const int loaded = backup ? LoadBackupSuperBlock() : LoadPrimarySuperBlock();
    if (loaded >= 0 && CheckSuperBlockValues() >= 0)
        return CopyState::kSound;
    return StateOfFailedCopy();
}

// What the copy that just failed to load is, from the register's code and
// the header read.
CopyState DvrDiskReader::StateOfFailedCopy() const
{
    switch (m_errorCode) {
    case kErrBlockTable:
    case kErrTableSize: return CopyState::kTableDamaged;
    case kErrTableLimit:
    case kErrGeometry: return CopyState::kImpossibleLayout;
    default: break;
    }
    const _H264SuperBlock_t& super = m_volume->superBlock;
    if (super.HeaderSize != kSuperHeaderSize || super.Magic != kSuperMagic)
        return CopyState::kNoSuperBlock;
    return CopyState::kSuperBlockDamaged;
}

void DvrDiskReader::InspectSuperBlockCopies()
{
    if (!m_volume || !m_source)
        return;
    const _H264SuperBlock_t inUse = m_volume->superBlock;
    std::vector<_H264BlockTable_t> table = m_volume->blockTable;
    const std::int32_t code = m_errorCode;
    const int place = m_errorPlace;
    const std::string text = m_errorText;
    if (m_status.primary == CopyState::kUnread)
        m_status.primary = LoadCopy(false);
    if (m_status.backup == CopyState::kUnread)
        m_status.backup = LoadCopy(true);
    m_volume->superBlock = inUse;
    m_volume->blockTable = std::move(table);
    SetErrorText(code, place, "%s", text.c_str());
}

// What the reader needs of a verified superblock's values before it uses them.
int DvrDiskReader::CheckSuperBlockValues()
{
    const _H264SuperBlock_t& super = m_volume->superBlock;
    if (super.TableLimit > super.TableLimitBound)
        return Refuse(kErrTableLimit, kAtTableLimit);
    if (!GeometryIsSound())
        return RefuseUnsoundGeometry();
    return 1;
}

void DvrDiskReader::CloseVolume()
{
    delete m_volume;
    m_volume = nullptr;
    m_source.reset();
}

int DvrDiskReader::LoadPrimarySuperBlock()
{
    if (!HasVolume())
        return -1;
    _H264SuperBlock_t& super = m_volume->superBlock;
    super = _H264SuperBlock_t{};
    ReadSectors(reinterpret_cast<char*>(&super), 0, kSuperBlockSize);
    if (VerifySuperBlock() < 0)
        return -1;
    if (ReloadBlockTable(super.SuperOffset) < 0)
        return -1;
    return VerifyBlockTable();
}

int DvrDiskReader::LoadBackupSuperBlock()
{
    if (!HasVolume())
        return -1;
    _H264SuperBlock_t& super = m_volume->superBlock;
    const wxUint64 backupOffset = super.SuperOffsetBackup;
    super = _H264SuperBlock_t{};
    ReadSectors(reinterpret_cast<char*>(&super), backupOffset, kSuperBlockSize);
    if (VerifySuperBlock() < 0)
        return -1;
    if (ReloadBlockTable(super.SuperOffsetBackup) < 0)
        return -1;
    if (VerifyBlockTable() < 0)
        return -1;
    return 1;
}

// Replaces the block table with a zero-filled one of BlockTableCount + 1
// entries and reads the table that lies 8192 bytes after superOffset.
int DvrDiskReader::ReloadBlockTable(wxUint64 superOffset)
{
    const std::uint32_t count = m_volume->superBlock.BlockTableCount;
    m_volume->blockTable.clear();
    m_volume->blockTable.shrink_to_fit();
    if (count > kMaxBlockTableCount)
        return Refuse(kErrTableSize, kAtTableSize);
    m_volume->blockTable.assign(static_cast<std::size_t>(count) + 1, _H264BlockTable_t{});
    if (count != 0)
        ReadSectors(reinterpret_cast<char*>(m_volume->blockTable.data()),
                   superOffset + kBlockTableGap,
                   static_cast<unsigned long>(count) * kBlockTableEntrySize);
    return 1;
}

int DvrDiskReader::VerifySuperBlock()
{
    if (!HasVolume())
        return -1;
    _H264SuperBlock_t& super = m_volume->superBlock;
    if (super.HeaderSize != kSuperHeaderSize) {
        SetErrorText(kErrSuperBlock, kAtHeaderSize, "%s[%d]%d != %d", kFunctionWord, kAtHeaderSize,
                     static_cast<int>(super.HeaderSize), static_cast<int>(kSuperHeaderSize));
        return -1;
    }
    if (super.Magic != kSuperMagic)
        return Refuse(kErrSuperBlock, kAtMagic);
    if (Checksum(reinterpret_cast<char*>(&super), kSuperHeaderSize) != 0) {
        m_errorCode = kErrSuperBlock;  // the text stays as the previous failure wrote it
        return -1;
    }
    return 1;
}

int DvrDiskReader::VerifyBlockTable()
{
    if (!HasVolume())
        return -1;
    const _H264SuperBlock_t& super = m_volume->superBlock;
    const std::uint64_t bytes = static_cast<std::uint64_t>(super.BlockTableCount) * kBlockTableEntrySize;
    // A table that was never loaded (or refused as too large) holds nothing.
    const std::uint64_t loaded = m_volume->blockTable.size() * sizeof(_H264BlockTable_t);
    std::uint8_t sum = 0;
    if (bytes <= loaded) {
        const auto* table = reinterpret_cast<const std::uint8_t*>(m_volume->blockTable.data());
        for (std::uint64_t i = 0; i < bytes; ++i)
            sum ^= table[i];
    }
    if (bytes > loaded || sum != super.BlockTableSum)
        return Refuse(kErrBlockTable, kAtBlockTable);
    return 1;
}

bool DvrDiskReader::GeometryIsSound() const
{
    if (!m_volume)
        return false;
    const _H264SuperBlock_t& super = m_volume->superBlock;
    if (super.BlockSizeShift < kMinBlockSizeShift || super.BlockSizeShift > kMaxBlockSizeShift)
        return false;
    return super.BlockSize == (1 << super.BlockSizeShift) && super.BlockMask == super.BlockSize - 1;
}

int DvrDiskReader::RefuseUnsoundGeometry()
{
    return Refuse(kErrGeometry, kAtGeometry);
}

bool DvrDiskReader::HasVolume()
{
    if (m_volume)
        return true;
    SetError(kErrNotReady, kAtNotReady);
    return false;
}

bool DvrDiskReader::HasAdapter()
{
    if (m_volume && m_volume->adapter)
        return true;
    SetError(kErrNotReady, kAtNotReady);
    return false;
}

int DvrDiskReader::ConfiguredVersion()
{
    char slot[kAdapterSize] = {};
    if (ReadLogical(0, slot, kAdapterSize) < 0)
        return -1;
    std::int32_t version = 0;
    std::memcpy(&version, slot + offsetof(_HisiAdapter_t, Version), sizeof version);
    return version;
}

// --- The operation-code entry points.

int DvrDiskReader::OpenDVRFS(wxString path)
{
    return OpenDisk(std::string(path.fn_str()));
}

void DvrDiskReader::CloseDVRFS()
{
    CloseVolume();
}

int DvrDiskReader::SuperBlockOpe(wxFile* /*file*/, char mode, void* /*arg*/)
{
    switch (mode) {
    case 3: return LoadPrimarySuperBlock();
    case 5: return LoadBackupSuperBlock();
    case 6: return VerifySuperBlock();
    case 7: return VerifyBlockTable();
    default: return 1;
    }
}

void DvrDiskReader::Getpartition(wxFile* /*file*/)
{
    if (!m_volume)
        return;
    char sector[kSectorSize] = {};
    ReadSectors(sector, 0, kSectorSize);
    auto entry = std::make_unique<std::array<char, kPartitionSlotSize>>();
    std::memcpy(entry->data(), sector + kPartitionSlotOffset, kPartitionSlotSize);
    m_volume->partitionEntry = std::move(entry);
}

int DvrDiskReader::Checkconfig()
{
    return ConfiguredVersion();
}

wxInt64 DvrDiskReader::GetInfo(char selector)
{
    if (!HasAdapter())
        return -1;
    const _HisiAdapter_t& adapter = *m_volume->adapter;
    switch (selector) {
    case 1:
        return adapter.FirstList.Idx;
    case 3:
        return adapter.FirstList.StartBlock;
    case 17:
        return adapter.LastList.Idx;
    case 19:
        return adapter.CurBlockHeader.Info;
    case 33:
        return adapter.ListMax;
    case 35:
        return adapter.DataBlockMax;
    case 49: {
        // Fill level of the data ring in percent, plus 100 once it has wrapped.
        if (adapter.DataBlockMax <= 0)
            return Refuse(kErrRingEmpty, kAtInfoRing);
        const std::int64_t newest = adapter.LastList.EndBlock;
        std::int64_t level = 100 * newest / adapter.DataBlockMax;
        if (adapter.FirstList.StartBlock > newest)
            level += 100;
        return level;
    }
    case 50:
        return adapter.TimeStamp;
    default:
        return -1;
    }
}

int DvrDiskReader::Checksum(char* data, int n)
{
    if (!data || n <= 0)
        return 0;
    unsigned char sum = 0;
    for (int i = 0; i < n; ++i)
        sum ^= static_cast<unsigned char>(data[i]);
    return static_cast<signed char>(sum);
}
