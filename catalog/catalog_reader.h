// The catalogue of the recordings on a disk, built headless on top of the
// disk reader: the playback panel derives from this class, so the build and
// its state are members of the panel too.
#ifndef CATALOG_CATALOG_READER_H
#define CATALOG_CATALOG_READER_H

#include <cstdint>
#include <vector>

#include <wx/string.h>

#include "catalog/record_catalog.h"
#include "dvrfs/dvr_disk_reader.h"

// How far a catalogue build got.
enum class CatalogBuild {
    kBuilt,          // the catalogue holds the disk's recordings
    kNotOpened,      // the disk did not open, or its superblock or block table is damaged
    kNotConfigured,  // no recorder was ever configured on the disk
    kNoAdapter,      // no current adapter could be found
};

class CatalogReader : public DvrDiskReader {
public:
    // Opens the disk, checks for a configured recorder, finds the current
    // adapter and fills the catalogue, in that order, stopping at the first
    // step that fails. A build that stops empties the catalogue: what it held
    // came from another disk, and must not be played as this one's.
    CatalogBuild BuildCatalog(const wxString& path);

    // Fills the catalogue from the open volume's list ring, oldest first.
    void Setplaylist();

    std::int32_t m_recordCount = 0;  // entries 0 .. m_recordCount - 1 are valid
    // The list position each valid entry was read from.
    std::vector<std::int32_t> m_rowPositions;
    // List positions of the recorder's span whose entry could be read in
    // neither copy, and so has no row: ascending, each once.
    std::vector<std::int32_t> m_skippedPositions;

private:
    void ClearEntries();
    void FillEntry(CatalogEntry& entry, const _HisiList_t& record);
    void CollectSkippedPositions();
};

#endif
