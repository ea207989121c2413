// The numbers in the error register's texts ("FUNCTION[642]"): each names the
// place in the reader that refused the disk.
#ifndef DVRFS_ERROR_PLACES_H
#define DVRFS_ERROR_PLACES_H

namespace dvrfs {

constexpr char kFunctionWord[] = "FUNCTION";

enum ErrorPlace : int {
    kAtTableLimit = 642,
    kAtGeometry = 650,
    kAtHeaderSize = 909,
    kAtMagic = 916,
    kAtTableSize = 925,
    kAtBlockTable = 934,
    kAtBackupSuperBlock = 945,
    kAtBackupBlockTable = 946,
    kAtNotReady = 1130,
    kAtNegativeRead = 1141,
    kAtReadBeyond = 1150,
    kAtAdapter = 1241,
    kAtAdapterRings = 1250,
    kAtListNegative = 1438,
    kAtListBeyond = 1445,
    kAtListEntry = 1463,
    kAtInfoRing = 1540,
    kAtBlockNegative = 1576,
    kAtBlockBeyond = 1583,
    kAtBlockHeader = 1600,
    kAtIndexNegative = 1623,
    kAtIndexBeyond = 1630,
    kAtIndexEntry = 1649,
    kAtPayloadNegative = 1661,
    kAtPayloadBeyond = 1666,
    kAtNoFrame = 1710,
};

}  // namespace dvrfs

#endif
