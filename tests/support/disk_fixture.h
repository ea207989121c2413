// A test that writes disk images with the image writer and reads them with
// the reader. After every test it checks that each image the reader opened
// was opened read-only and still holds exactly the bytes it was written with.
#ifndef TESTS_SUPPORT_DISK_FIXTURE_H
#define TESTS_SUPPORT_DISK_FIXTURE_H

#include <gtest/gtest.h>

#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "catalog/catalog_reader.h"
#include "tools/dvrfs/disk_check.h"
#include "tools/dvrimage/dvr_image.h"

// A fingerprint of a sparse file: its size and a hash of its data extents.
std::string FileFingerprint(const std::string& path);

// Rewrites bytes of both superblock copies and seals their header sums
// again, for values the writer cannot lay out (a table too large to write,
// a block space beyond any file).
void PatchSuperBlocks(dvrimage::DiskImage& image, const std::string& path, std::size_t at, const void* bytes,
                      std::size_t size);

// A small, valid geometry: 4096-byte blocks, 16 list entries, 8 data blocks.
dvrimage::Layout SmallLayout();

// The payloads extraction delivers for a recording, one after another.
std::vector<unsigned char> Extracted(CatalogReader& reader, const _HisiList_t& recording,
                                     dvrfstool::ExtractResult* result = nullptr);

// Table-driven tests: a case's `name` names its test.
template <typename Case>
std::string CaseName(const ::testing::TestParamInfo<Case>& info)
{
    return info.param.name;
}

// Damage to write into an image: a target and its place (see DiskImage::Damage).
struct Damage {
    dvrimage::Target target;
    std::int64_t a = 0;
    std::int64_t b = 0;
};

// The catalogue reader with the adapter in memory open to a test that
// reshapes it.
class TestReader : public CatalogReader {
public:
    using DvrDiskReader::MutableAdapter;
};

class DiskTest : public ::testing::Test {
protected:
    void SetUp() override;
    void TearDown() override;

    // Writes the image into this test's folder and remembers its fingerprint
    // (call again after damaging it).
    std::string WriteImage(dvrimage::DiskImage& image, const std::string& name = "disk.img");
    // Writes the image, then damages it.
    std::string WriteDamaged(dvrimage::DiskImage& image, const std::vector<Damage>& damage,
                             const std::string& name = "disk.img");
    void Refingerprint(const std::string& path);
    // Writes a disk of this geometry and these recordings into image_, then
    // damages it.
    std::string WriteDisk(const dvrimage::Layout& layout, const std::vector<dvrimage::Recording>& recordings,
                          const std::vector<Damage>& damage = {}, const std::string& name = "disk.img");

    // Opens the image with reader_ and runs what a catalogue build runs
    // first: configured-recorder check and adapter search.
    int Open(const std::string& path);
    int OpenAndSearch(const std::string& path);
    CatalogBuild Build(const std::string& path) { return reader_.BuildCatalog(path); }

    const _HisiAdapter_t& Adapter() const { return *reader_.Adapter(); }
    std::string ErrorText() const { return reader_.ErrorText(); }

    std::string dir_;
    TestReader reader_;
    std::unique_ptr<dvrimage::DiskImage> image_;

private:
    void KeepDisks();
    std::map<std::string, std::string> fingerprints_;
};

#endif
