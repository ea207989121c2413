// The catalogue of the recordings on a disk, built headless on top of the
// disk reader: the playback panel derives from this class, so the build and
// its state are members of the panel too.
#ifndef CATALOG_CATALOG_READER_H
#define CATALOG_CATALOG_READER_H

#include <cstdint>
#include <string>
#include <vector>

#include "catalog/record_catalog.h"
#include "dvrfs/dvr_disk_reader.h"

// How far a catalogue build got.
enum class CatalogBuild {
    kBuilt,          // the catalogue holds the disk's recordings
    kNotOpened,      // the disk did not open, or its superblock or block table is damaged
    kNotConfigured,  // no recorder was ever configured on the disk
    kNoAdapter,      // no current adapter could be found, or no entry of its list read
};

// The coarse outcome of a build, from the open's status (Status() has the
// detail).
CatalogBuild BuildOutcome(const dvrfs::VolumeStatus& status);

class CatalogReader : public DvrDiskReader {
public:
    // Opens `path` (bytes, as given) as a volume and fills the catalogue.
    // A build that stops empties the catalogue: what it held came from
    // another disk, and must not be played as this one's.
    CatalogBuild BuildCatalog(const std::string& path);

    // Fills the catalogue from the open volume's list ring, oldest first.
    void Setplaylist();
    // The catalogue as the build fills it (a test may reshape an entry).
    using DvrDiskReader::MutableCatalog;

    std::int32_t m_recordCount = 0;  // entries 0 .. m_recordCount - 1 are valid
    // The list position each valid entry was read from.
    std::vector<std::int32_t> m_rowPositions;
    // List positions of the recorder's span whose entry could be read in
    // neither copy, and so has no row: ascending, each once.
    std::vector<std::int32_t> m_skippedPositions;
    // List positions of the span whose entry was never written (both copies
    // hold only zero bytes): ascending, each once.
    std::vector<std::int32_t> m_unwrittenPositions;
    // The row of the newest recording when its newest block could not be
    // read, else -1.
    std::int32_t m_newestBlockUnreadableRow = -1;

private:
    void ClearEntries();
    void FillEntry(CatalogEntry& entry, const _HisiList_t& record);
    void CollectSkippedPositions();
    void MarkNewestBlockUnreadable();
};

#endif
