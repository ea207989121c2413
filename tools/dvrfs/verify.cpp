// The verification walk: every structure of the disk read once, each record
// checked by its XOR sum (and its bounds), each finding reported on a line.
#include <algorithm>
#include <cstdio>
#include <vector>

#include <wx/log.h>

#include "dvrfs/image_source.h"
#include "tools/dvrfs/disk_check.h"

namespace dvrfstool {
namespace {

constexpr std::int64_t kDataBlockBytes = 1 << 24;
constexpr int kMaxFramesInBlock = 262142;

class Verifier {
public:
    Verifier(CatalogReader& reader, const std::function<void(const std::string&)>& report)
        : reader_(reader), report_(report)
    {
    }

    VerifyResult Run(const wxString& path)
    {
        reader_.m_errorCode = kErrNone;
        reader_.m_errorText[0] = '\0';
        if (reader_.OpenDVRFS(path) <= 0) {
            // Neither copy opens: say what is wrong with each, if the device reads.
            if (OpenWithoutVerifying(path))
                CheckSuperBlockCopies();
            reader_.CloseDVRFS();
            return result_;
        }
        CheckSuperBlockCopies();
        CheckAdapterSlots();
        if (reader_.Checkconfig() <= 0) {
            result_.stage = VerifyStage::kNotConfigured;
            return result_;
        }
        if (reader_.BlockOpe(reader_.m_diskFile, 2, nullptr, 0, 0) < 0 && !reader_.m_volume->adapter) {
            result_.stage = VerifyStage::kNoAdapter;
            return result_;
        }
        result_.stage = VerifyStage::kComplete;
        CheckListSpan(SpanOnDisk());
        CheckRecordings();
        return result_;
    }

private:
    const _HisiAdapter_t& Adapter() const { return *reader_.m_volume->adapter; }
    wxFile* File() const { return reader_.m_diskFile; }

    void Damaged(const std::string& what)
    {
        ++result_.damaged;
        report_("damaged: " + what);
    }

    void Repaired(const std::string& what)
    {
        ++result_.repaired;
        report_("repaired: " + what);
    }

    bool SumMatches(void* record, int size)
    {
        return static_cast<std::uint8_t>(reader_.Checksum(static_cast<char*>(record), size)) == Adapter().RecordSum;
    }

    // Reads `size` bytes at a logical position; false when the read is refused.
    bool ReadAt(std::uint64_t position, void* buffer, std::int64_t size)
    {
        if (position > static_cast<std::uint64_t>(INT64_MAX) || size > INT_MAX)
            return false;
        return reader_.BlockRead(File(), static_cast<wxInt64>(position), static_cast<char*>(buffer),
                                 static_cast<int>(size)) > 0;
    }

    // The device or image, opened as the volume open does (in place of what
    // the failed open left), with an empty volume for the superblock loads
    // to fill.
    bool OpenWithoutVerifying(const wxString& path)
    {
        reader_.CloseDVRFS();
        reader_.m_diskFile = new wxFile;
        reader_.m_volume = new DvrVolume;
        wxLogNull quiet;
        if (!reader_.m_diskFile->Open(path, wxFile::read))
            return false;
        std::string sourceError;
        reader_.m_imageSource = dvrfs::OpenImageSource(path.utf8_string(), &sourceError);
        return reader_.m_imageSource || sourceError.empty();
    }

    // Both copies of the superblock and block table, each checked as the
    // volume open checks it; the copy in use and the register stay as the
    // open left them. The backup is found from the primary copy, as the open
    // finds it.
    void CheckSuperBlockCopies()
    {
        DvrVolume& volume = *reader_.m_volume;
        const _H264SuperBlock_t inUse = volume.superBlock;
        const std::vector<_H264BlockTable_t> table = volume.blockTable;
        const std::int32_t code = reader_.m_errorCode;
        const std::string text = reader_.m_errorText;
        CheckSuperBlockCopy("primary", 3);
        CheckSuperBlockCopy("backup", 5);
        volume.superBlock = inUse;
        volume.blockTable = table;
        reader_.m_errorCode = code;
        std::snprintf(reader_.m_errorText, sizeof reader_.m_errorText, "%s", text.c_str());
    }

    void CheckSuperBlockCopy(const std::string& copy, char mode)
    {
        ++result_.checked;
        if (reader_.SuperBlockOpe(File(), mode, nullptr) >= 0 && reader_.CheckSuperBlockValues() >= 0) {
            ++result_.checked;  // and its block table
            return;
        }
        if (reader_.m_errorCode == kErrBlockTable || reader_.m_errorCode == kErrTableSize) {
            ++result_.checked;
            Damaged(copy + " block table");
        } else {
            Damaged(copy + " superblock");
        }
    }

    // A slot that carries its own number but fails its sum is damaged; a slot
    // with another number is simply not in use.
    void CheckAdapterSlots()
    {
        const std::int64_t stride = reader_.m_volume->superBlock.BlockSize;
        for (int slot = 0; slot < kAdapterSlotCount; ++slot) {
            _HisiAdapter_t adapter{};
            if (!ReadAt(static_cast<std::uint64_t>(slot * stride), &adapter, kAdapterSize)) {
                Damaged("adapter ring (slot " + std::to_string(slot) + " lies outside the block space)");
                return;
            }
            ++result_.checked;
            if (adapter.Idx == slot && reader_.Checksum(reinterpret_cast<char*>(&adapter), kAdapterSize) != 0)
                Damaged("adapter slot " + std::to_string(slot));
        }
    }

    // The span of recordings as the current adapter's slot on the disk gives
    // it: the search's refresh narrows the adapter in memory to the readable
    // entries, which would hide damage at either end.
    std::pair<std::int64_t, std::int64_t> SpanOnDisk()
    {
        _HisiAdapter_t slot{};
        const std::uint64_t position = static_cast<std::uint64_t>(Adapter().Idx) * reader_.m_volume->superBlock.BlockSize;
        if (Adapter().Idx >= 0 && ReadAt(position, &slot, kAdapterSize) && slot.Idx == Adapter().Idx)
            return {slot.FirstList.Idx, slot.LastList.Idx};
        return {Adapter().FirstList.Idx, Adapter().LastList.Idx};
    }

    // Each list position of the span once, in the list ring and in the mirror.
    void CheckListSpan(std::pair<std::int64_t, std::int64_t> span)
    {
        const std::int64_t ringSize = Adapter().ListMax;
        const std::int64_t first = span.first;
        std::int64_t last = span.second;
        if (last < first)
            last += ringSize;
        if (ringSize <= 0 || last < first)
            return;
        const std::int64_t from = std::max<std::int64_t>(first, 0);
        const std::int64_t to = std::min(last, from + ringSize - 1);
        for (std::int64_t p = from; p <= to; ++p) {
            const std::int64_t position = p % ringSize;
            _HisiList_t ring{};
            _HisiList_t mirror{};
            const bool ringSound =
                ReadAt(Adapter().ListOffset + position * kListEntrySize, &ring, kListEntrySize) &&
                SumMatches(&ring, kListEntrySize);
            const bool mirrorSound =
                ReadAt(Adapter().ListOffsetBackup + position * kListEntrySize, &mirror, kListEntrySize) &&
                SumMatches(&mirror, kListEntrySize);
            result_.checked += 2;
            const std::string name = "list entry " + std::to_string(position);
            if (!ringSound && !mirrorSound)
                Damaged(name + " (ring and mirror copies)");
            else if (!ringSound)
                Repaired(name + " (ring copy damaged, mirror copy used)");
            else if (!mirrorSound)
                Damaged(name + " (mirror copy)");
            if (ringSound || mirrorSound)
                AddRecordingBlocks(ringSound ? ring : mirror);
        }
    }

    // The data blocks a recording claims, as runs of block numbers inside the
    // ring (a recording across the end of the ring is two runs).
    void AddRecordingBlocks(const _HisiList_t& recording)
    {
        const std::int64_t ringSize = Adapter().DataBlockMax;
        if (ringSize <= 0)
            return;
        const std::int64_t start = recording.StartBlock;
        std::int64_t end = recording.EndBlock;
        if (end < start)
            end += ringSize;
        if (start < 0 || start >= ringSize || end < start || end >= start + ringSize) {
            Damaged("list entry " + std::to_string(recording.Idx) + " (data blocks outside the data ring)");
            return;
        }
        claimed_.push_back({start, std::min(end, ringSize - 1)});
        if (end >= ringSize)
            claimed_.push_back({0, end - ringSize});
    }

    // Each claimed block once, in block order, however many recordings claim
    // it: the work is the list span plus the data ring, not their product.
    void CheckRecordings()
    {
        std::sort(claimed_.begin(), claimed_.end());
        std::int64_t next = 0;  // every block below it is checked
        for (const auto& [first, last] : claimed_) {
            for (std::int64_t block = std::max(first, next); block <= last; ++block)
                CheckDataBlock(block);
            next = std::max(next, last + 1);
        }
    }

    void CheckDataBlock(std::int64_t block)
    {
        const std::string name = "data block " + std::to_string(block);
        _HisiBlockHeader_t header{};
        ++result_.checked;
        if (reader_.BlockOpe(File(), 65, &header, block, 1) < 0) {
            Damaged(name + " header");
            return;
        }
        if (header.BlockIdx != block) {
            Damaged(name + " header (names block " + std::to_string(header.BlockIdx) + ")");
            return;
        }
        const std::int64_t frames = header.FrameCount;
        if (frames < 0 || frames > kMaxFramesInBlock) {
            Damaged(name + " header (frame count " + std::to_string(frames) + ")");
            return;
        }
        // The index entries are one range at the end of the block, newest first.
        index_.resize(static_cast<std::size_t>(frames));
        const std::uint64_t end = Adapter().DataBlockOffset + static_cast<std::uint64_t>(block + 1) * kDataBlockBytes;
        if (!ReadAt(end - static_cast<std::uint64_t>(frames) * kIndexEntrySize, index_.data(),
                    frames * kIndexEntrySize)) {
            Damaged(name + " index (outside the block space)");
            return;
        }
        result_.checked += frames;
        for (std::int64_t k = 0; k < frames; ++k) {
            _HisiHeader_t& entry = index_[static_cast<std::size_t>(frames - 1 - k)];
            const std::string entryName = name + " index entry " + std::to_string(k);
            if (!SumMatches(&entry, kIndexEntrySize))
                Damaged(entryName);
            else if (entry.DataOffset < 0 || entry.DataSize < 0 ||
                     std::int64_t{entry.DataOffset} + entry.DataSize > kPayloadAreaSize)
                Damaged(entryName + " (payload outside the block)");
        }
    }

    CatalogReader& reader_;
    const std::function<void(const std::string&)>& report_;
    VerifyResult result_;
    std::vector<std::pair<std::int64_t, std::int64_t>> claimed_;  // runs of claimed blocks, first and last
    std::vector<_HisiHeader_t> index_;
};

}  // namespace

VerifyResult VerifyDisk(CatalogReader& reader, const wxString& path,
                        const std::function<void(const std::string&)>& report)
{
    return Verifier(reader, report).Run(path);
}

}  // namespace dvrfstool
