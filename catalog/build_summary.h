// What a catalogue build found, in plain words for the person holding the
// disk: how many recordings and when, what was passed over, or why the disk
// could not be read.
#ifndef CATALOG_BUILD_SUMMARY_H
#define CATALOG_BUILD_SUMMARY_H

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "catalog/catalog_reader.h"

// For example "4 recordings, 2023-11-14 22:13 to 2023-11-15 02:13 (local
// time); 1 damaged entry skipped", or, for a disk that could not be read, why
// (the open's status in its own words). `reader` is the one that ran the
// build, as it was left.
std::string DescribeBuild(const CatalogReader& reader);

// List positions (ascending) as runs, "2, 6, 9-40", at most `maxRuns` of
// them and then how many there are in all: a ring of a million damaged
// entries is said in a line, not a million numbers.
std::string PositionsText(const std::vector<std::int32_t>& positions, std::size_t maxRuns = 20);

#endif
