// The catalogue of the recordings found on a disk: one fixed block per panel,
// allocated once by the volume open and refilled by every catalogue build.
#ifndef CATALOG_RECORD_CATALOG_H
#define CATALOG_RECORD_CATALOG_H

#include <cstddef>
#include <cstdint>

constexpr int kCatalogCapacity = 8192;

struct CatalogEntry {
    std::int32_t Idx;        // list index of the recording, -1 when unfilled
    std::int32_t StartTime;  // seconds since 1970-01-01 00:00:00 UTC
    std::int32_t EndTime;
    char DateText[24];       // "%04d/%02d/%02d" of StartTime, UTC
    char TimeText[24];       // "%02d:%02d:%02d-%02d:%02d:%02d" of both times, UTC

    // The times as the recorder wrote them, unsigned: every text made of an
    // entry reads them here, so that a time past 2038 stays in its century.
    std::uint32_t StartSeconds() const { return static_cast<std::uint32_t>(StartTime); }
    std::uint32_t EndSeconds() const { return static_cast<std::uint32_t>(EndTime); }
};

struct RecordCatalog {
    std::uint8_t Opened;
    std::uint8_t Reserved[128];
    std::uint8_t Opened2;
    std::uint16_t SpanCount;
    CatalogEntry Entries[kCatalogCapacity];
};

static_assert(sizeof(CatalogEntry) == 60, "catalogue entry size");
static_assert(offsetof(RecordCatalog, Opened2) == 129, "catalogue header");
static_assert(offsetof(RecordCatalog, SpanCount) == 130, "catalogue header");
static_assert(offsetof(RecordCatalog, Entries) == 132, "catalogue entries");

#endif
