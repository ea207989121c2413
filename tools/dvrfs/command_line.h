// What the dvrfs commands share: exit statuses, the parsed command line,
// the usage error, the progress bar, the checks on an output path, and the
// catalogue build with its failure said in plain words.
#ifndef TOOLS_DVRFS_COMMAND_LINE_H
#define TOOLS_DVRFS_COMMAND_LINE_H

#include <chrono>
#include <cstdint>
#include <map>
#include <set>
#include <string>
#include <vector>

#include "catalog/catalog_reader.h"
#include "catalog/time_text.h"

namespace dvrfscli {

enum ExitStatus {
    kOk = 0,
    kDiskUnreadable = 1,  // the disk cannot be read as a recorder disk
    kUsageError = 2,
    kDamageFound = 3,     // verify found damage
    kLeftOut = 4,         // export left damaged frames or blocks out
    kOutputFailed = 5,    // an output could not be written
};

// Options may stand before or after the operands; "--" ends them.
struct CommandLine {
    std::string command;
    std::vector<std::string> operands;
    std::map<std::string, std::string> values;  // -o, --format, --from, --to, --blocks
    std::set<std::string> flags;                // --json, --dump, --force, --help, ...

    bool Has(const std::string& flag) const { return flags.count(flag) != 0; }
    const std::string* Value(const std::string& option) const
    {
        auto it = values.find(option);
        return it == values.end() ? nullptr : &it->second;
    }
};

// Parses argv; false (with a usage error said) when an option lacks its value.
bool ParseCommandLine(int argc, char** argv, CommandLine* line);

int UsageError(const std::string& message);

// The zone of the times that the text outputs print: UTC, or with --local
// the workstation's. JSON times stay UTC.
void SetTextZone(Zone zone);
Zone TextZone();
// "2023-11-14T22:13:20Z" in UTC, "2023-11-14T23:13:20+0100" in local time.
std::string TextTime(double seconds);
// "UTC" or "local time".
const char* TextZoneName();

// A progress bar on standard error, redrawn at most ten times a second, and
// only when standard error is a terminal.
class ProgressBar {
public:
    ProgressBar();
    ~ProgressBar();
    void Show(double fraction);

private:
    bool shown_;
    bool drawn_ = false;
    std::chrono::steady_clock::time_point last_{};
};

// Refuses the disk itself, any device and, without --force, an existing
// file as an output; kOk when `output` may be written.
int CheckOutput(const std::string& disk, const std::string& output, bool force);

// Builds the catalogue as the panel does; when the disk cannot be read as a
// recorder disk, says why on standard error and returns kDiskUnreadable.
int BuildCatalog(CatalogReader& reader, const std::string& disk);

// Says on standard error, in plain words and then with the reader's code,
// why an open that stopped as `status` says cannot go on; kDiskUnreadable.
int SayWhyNot(const dvrfs::VolumeStatus& status, const std::string& disk);

// The evidence commands: export, hash, recover.
int ExportCommand(const CommandLine& line);
int HashCommand(const std::string& disk);
int RecoverCommand(const std::string& disk, bool json);

// "FIRST:LAST" of --blocks; false when it is not two block numbers.
bool ParseBlocks(const std::string& text, std::int32_t* first, std::int32_t* last);

}  // namespace dvrfscli

#endif
