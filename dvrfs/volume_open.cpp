// Volume open and close, superblock and block table verification, the error
// register and the small queries on an open volume.
#include <cstdarg>
#include <cstdio>
#include <cstring>

#include <wx/log.h>

#include "dvrfs/dvr_disk_reader.h"
#include "dvrfs/error_places.h"

using namespace dvrfs;

DvrDiskReader::DvrDiskReader()
    : m_catalog(nullptr),
      m_volume(nullptr),
      m_errorText{},
      m_errorCode(kErrNone),
      m_streamBlock(0),
      m_streamFrame(0),
      m_diskFile(nullptr)
{
}

DvrDiskReader::~DvrDiskReader()
{
    CloseDVRFS();
    delete m_catalog;
    m_catalog = nullptr;
}

void DvrDiskReader::SetError(std::int32_t code, int number)
{
    SetErrorText(code, "%s[%d]", kFunctionWord, number);
}

int DvrDiskReader::Refuse(std::int32_t code, int number)
{
    SetError(code, number);
    return -1;
}

void DvrDiskReader::SetErrorText(std::int32_t code, const char* format, ...)
{
    m_errorCode = code;
    va_list args;
    va_start(args, format);
    std::vsnprintf(m_errorText, sizeof m_errorText, format, args);
    va_end(args);
}

int DvrDiskReader::OpenDVRFS(wxString path)
{
    if (!m_diskFile)
        m_diskFile = new wxFile;
    if (!m_volume)
        m_volume = new DvrVolume;
    if (!m_catalog) {
        m_catalog = new RecordCatalog;
        m_catalog->Opened = 0;
        std::memset(m_catalog->Reserved, 0, sizeof m_catalog->Reserved);
        m_catalog->Opened2 = 0;
        m_catalog->SpanCount = 0;
    }

    // An adapter found on the device held so far says nothing of the next one.
    m_volume->adapter.reset();
    {
        // A disk that cannot be opened is an answer, not something to show.
        wxLogNull quiet;
        if (m_diskFile->IsOpened())
            m_diskFile->Close();
        if (!m_diskFile->Open(path, wxFile::read, wxS_DEFAULT))
            return 0;
    }
    std::string sourceError;
    m_imageSource = OpenImageSource(path.utf8_string(), &sourceError);
    if (!m_imageSource && !sourceError.empty()) {
        m_diskFile->Close();  // an image of a known kind that does not open is no disk
        return 0;
    }
    m_catalog->Opened = 1;
    m_catalog->Opened2 = 1;

    Getpartition(m_diskFile);
    if (LoadSuperBlock(m_diskFile) < 0) {
        CloseDVRFS();
        return 0;
    }
    return 1;
}

// The primary copy when it is sound, else the backup copy when that is: the
// backup exists so that one damaged sector does not lose the disk. The
// register then says which part of the primary copy was damaged.
int DvrDiskReader::LoadSuperBlock(wxFile* file)
{
    m_volume->copyInUse = SuperBlockCopy::kPrimary;
    if (SuperBlockOpe(file, 3, nullptr) >= 0 && CheckSuperBlockValues() >= 0)
        return 1;
    const bool onlyTableDamaged = m_errorCode == kErrBlockTable || m_errorCode == kErrTableSize;
    if (SuperBlockOpe(file, 5, nullptr) < 0 || CheckSuperBlockValues() < 0)
        return -1;
    if (onlyTableDamaged) {
        m_volume->copyInUse = SuperBlockCopy::kBackupTable;
        SetError(kErrBackupBlockTable, kAtBackupBlockTable);
    } else {
        m_volume->copyInUse = SuperBlockCopy::kBackupSuperBlock;
        SetError(kErrBackupSuperBlock, kAtBackupSuperBlock);
    }
    return 1;
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

void DvrDiskReader::CloseDVRFS()
{
    delete m_volume;
    m_volume = nullptr;
    m_imageSource.reset();
    if (m_diskFile) {
        m_diskFile->Close();
        delete m_diskFile;
        m_diskFile = nullptr;
    }
}

int DvrDiskReader::SuperBlockOpe(wxFile* file, char mode, void* /*arg*/)
{
    if (mode != 3 && mode != 5 && mode != 6 && mode != 7)
        return 1;
    if (!HasVolume())
        return -1;
    switch (mode) {
    case 3:
        return LoadPrimarySuperBlock(file);
    case 5:
        return LoadBackupSuperBlock(file);
    case 6:
        return VerifySuperBlock();
    default:
        return VerifyBlockTable();
    }
}

int DvrDiskReader::LoadPrimarySuperBlock(wxFile* file)
{
    _H264SuperBlock_t& super = m_volume->superBlock;
    super = _H264SuperBlock_t{};
    HddataRead(file, reinterpret_cast<char*>(&super), 0, kSuperBlockSize);
    if (VerifySuperBlock() < 0)
        return -1;
    if (ReloadBlockTable(file, super.SuperOffset) < 0)
        return -1;
    return VerifyBlockTable();
}

int DvrDiskReader::LoadBackupSuperBlock(wxFile* file)
{
    _H264SuperBlock_t& super = m_volume->superBlock;
    const wxUint64 backupOffset = super.SuperOffsetBackup;
    super = _H264SuperBlock_t{};
    HddataRead(file, reinterpret_cast<char*>(&super), backupOffset, kSuperBlockSize);
    if (VerifySuperBlock() < 0)
        return -1;
    if (ReloadBlockTable(file, super.SuperOffsetBackup) < 0)
        return -1;
    if (VerifyBlockTable() < 0)
        return -1;
    return 1;
}

// Replaces the block table with a zero-filled one of BlockTableCount + 1
// entries and reads the table that lies 8192 bytes after superOffset.
int DvrDiskReader::ReloadBlockTable(wxFile* file, wxUint64 superOffset)
{
    const std::uint32_t count = m_volume->superBlock.BlockTableCount;
    m_volume->blockTable.clear();
    m_volume->blockTable.shrink_to_fit();
    if (count > kMaxBlockTableCount)
        return Refuse(kErrTableSize, kAtTableSize);
    m_volume->blockTable.assign(static_cast<std::size_t>(count) + 1, _H264BlockTable_t{});
    if (count != 0)
        HddataRead(file, reinterpret_cast<char*>(m_volume->blockTable.data()),
                   superOffset + kBlockTableGap,
                   static_cast<unsigned long>(count) * kBlockTableEntrySize);
    return 1;
}

int DvrDiskReader::VerifySuperBlock()
{
    _H264SuperBlock_t& super = m_volume->superBlock;
    if (super.HeaderSize != kSuperHeaderSize) {
        SetErrorText(kErrSuperBlock, "%s[%d]%d != %d", kFunctionWord, kAtHeaderSize,
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

void DvrDiskReader::Getpartition(wxFile* file)
{
    if (!m_volume)
        return;
    char sector[kSectorSize] = {};
    HddataRead(file, sector, 0, kSectorSize);
    auto entry = std::make_unique<std::array<char, kPartitionSlotSize>>();
    std::memcpy(entry->data(), sector + kPartitionSlotOffset, kPartitionSlotSize);
    m_volume->partitionEntry = std::move(entry);
}

int DvrDiskReader::Checkconfig()
{
    char slot[kAdapterSize] = {};
    if (BlockRead(m_diskFile, 0, slot, kAdapterSize) < 0)
        return -1;
    std::int32_t version = 0;
    std::memcpy(&version, slot + offsetof(_HisiAdapter_t, Version), sizeof version);
    return version;
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
