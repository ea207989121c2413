// The verification walk: every structure of the disk read once, each record
// checked by its XOR sum (and its bounds), each finding reported on a line.
#include <algorithm>
#include <climits>
#include <vector>

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

    VerifyResult Run(const std::string& path)
    {
        reader_.ClearError();
        const dvrfs::VolumeStatus status = reader_.OpenVolume(path);
        result_.status = status;
        if (status.stage == dvrfs::OpenStage::kSource)
            return result_;
        // Both copies as the open found them; the one it did not need is read now.
        reader_.InspectSuperBlockCopies();
        CheckSuperBlockCopy("primary", reader_.Status().primary);
        CheckSuperBlockCopy("backup", reader_.Status().backup);
        if (status.stage == dvrfs::OpenStage::kSuperBlock)
            return result_;
        CheckAdapterSlots();
        if (status.stage == dvrfs::OpenStage::kConfiguration) {
            result_.stage = VerifyStage::kNotConfigured;
            return result_;
        }
        if (!reader_.Adapter()) {
            result_.stage = VerifyStage::kNoAdapter;
            return result_;
        }
        result_.stage = VerifyStage::kComplete;
        CheckListSpan(SpanOnDisk());
        CheckRecordings();
        return result_;
    }

private:
    const _HisiAdapter_t& Adapter() const { return *reader_.Adapter(); }

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
        return reader_.ReadLogical(static_cast<wxInt64>(position), static_cast<char*>(buffer),
                                   static_cast<int>(size)) > 0;
    }

    // One copy of the superblock and its block table, as the open checks it:
    // the table is checked only under a sound superblock.
    void CheckSuperBlockCopy(const std::string& copy, dvrfs::CopyState state)
    {
        ++result_.checked;
        switch (state) {
        case dvrfs::CopyState::kSound: ++result_.checked; break;
        case dvrfs::CopyState::kTableDamaged:
            ++result_.checked;
            Damaged(copy + " block table");
            break;
        default: Damaged(copy + " superblock"); break;
        }
    }

    // A slot that carries its own number but fails its sum is damaged; a slot
    // with another number is simply not in use.
    void CheckAdapterSlots()
    {
        const std::int64_t stride = reader_.Volume()->superBlock.BlockSize;
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
        const std::uint64_t position = static_cast<std::uint64_t>(Adapter().Idx) * reader_.Volume()->superBlock.BlockSize;
        if (Adapter().Idx >= 0 && ReadAt(position, &slot, kAdapterSize) && slot.Idx == Adapter().Idx)
            return {slot.FirstList.Idx, slot.LastList.Idx};
        return {Adapter().FirstList.Idx, Adapter().LastList.Idx};
    }

    // Each list position of the span once, in the list ring and in the mirror.
    // An entry whose two copies hold only zero bytes was never written; a
    // recorder whose newest position is negative and whose span holds no
    // readable entry has recorded nothing, so nothing of its list is damage.
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
        if (span.second < 0 && !AnyEntryReadable(from, to, ringSize)) {
            result_.checked += 2 * (to - from + 1);
            return;
        }
        for (std::int64_t p = from; p <= to; ++p) {
            const std::int64_t position = p % ringSize;
            const ListCopies copies = ReadListCopies(position);
            result_.checked += 2;
            const std::string name = "list entry " + std::to_string(position);
            if (!copies.ringSound && !copies.mirrorSound && copies.blank) {
                ++result_.unwritten;
                report_("unwritten: " + name + " (never written)");
            } else if (!copies.ringSound && !copies.mirrorSound) {
                Damaged(name + " (ring and mirror copies)");
            } else if (!copies.ringSound) {
                Repaired(name + " (ring copy damaged, mirror copy used)");
            } else if (!copies.mirrorSound) {
                Damaged(name + " (mirror copy)");
            }
            if (copies.ringSound || copies.mirrorSound)
                AddRecordingBlocks(copies.ringSound ? copies.ring : copies.mirror);
        }
    }

    // Whether any entry of positions from .. to reads in either copy; it
    // stops at the first that does, so a recorder's list costs one entry.
    bool AnyEntryReadable(std::int64_t from, std::int64_t to, std::int64_t ringSize)
    {
        for (std::int64_t p = from; p <= to; ++p) {
            const ListCopies copies = ReadListCopies(p % ringSize);
            if (copies.ringSound || copies.mirrorSound)
                return true;
        }
        return false;
    }

    struct ListCopies {
        _HisiList_t ring{};
        _HisiList_t mirror{};
        bool ringSound = false;
        bool mirrorSound = false;
        bool blank = true;  // both copies read whole and hold only zero bytes
    };

    ListCopies ReadListCopies(std::int64_t position)
    {
        ListCopies copies;
        const bool ringRead = ReadAt(Adapter().ListOffset + position * kListEntrySize, &copies.ring, kListEntrySize);
        copies.blank = ringRead && reader_.LastReadWhole() && Blank(copies.ring);
        copies.ringSound = ringRead && SumMatches(&copies.ring, kListEntrySize);
        const bool mirrorRead =
            ReadAt(Adapter().ListOffsetBackup + position * kListEntrySize, &copies.mirror, kListEntrySize);
        copies.blank = copies.blank && mirrorRead && reader_.LastReadWhole() && Blank(copies.mirror);
        copies.mirrorSound = mirrorRead && SumMatches(&copies.mirror, kListEntrySize);
        return copies;
    }

    static bool Blank(const _HisiList_t& entry)
    {
        const auto* bytes = reinterpret_cast<const unsigned char*>(&entry);
        return std::all_of(bytes, bytes + sizeof entry, [](unsigned char b) { return b == 0; });
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
        if (reader_.ReadBlockHeaders(block, 1, reinterpret_cast<char*>(&header)) < 0) {
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

VerifyResult VerifyDisk(CatalogReader& reader, const std::string& path,
                        const std::function<void(const std::string&)>& report)
{
    return Verifier(reader, report).Run(path);
}

}  // namespace dvrfstool
