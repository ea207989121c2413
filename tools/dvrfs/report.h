// A case report on a disk: what the disk is, what verification found and
// the catalogue with a picture of each recording, as JSON, CSV and a
// self-contained HTML page a browser opens.
#ifndef TOOLS_DVRFS_REPORT_H
#define TOOLS_DVRFS_REPORT_H

#include <string>

namespace dvrfstool {

struct ReportRequest {
    std::string disk;
    std::string folder;     // report.json, report.csv and report.html go here
    std::string toolVersion;
    bool hash = false;      // add the whole disk's SHA-256
};

// Writes the three files; an empty text, or why the report could not be made.
std::string WriteReport(const ReportRequest& request);

}  // namespace dvrfstool

#endif
