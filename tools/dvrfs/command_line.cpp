#include "tools/dvrfs/command_line.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>

#include "catalog/build_summary.h"
#include "tools/dvrfs/export.h"
#include "tools/dvrfs/json_text.h"

namespace dvrfscli {

bool ParseCommandLine(int argc, char** argv, CommandLine* line)
{
    static const std::set<std::string> kTakeValue = {"-o", "--format", "--from", "--to", "--blocks"};
    bool optionsEnded = false;
    for (int i = 1; i < argc; ++i) {
        const std::string arg = argv[i];
        if (!optionsEnded && arg == "--") {
            optionsEnded = true;
        } else if (!optionsEnded && kTakeValue.count(arg)) {
            if (i + 1 >= argc) {
                UsageError(arg + " needs a value");
                return false;
            }
            line->values[arg] = argv[++i];
        } else if (!optionsEnded && arg.size() > 1 && arg[0] == '-') {
            line->flags.insert(arg == "-h" ? "--help" : arg);
        } else if (line->command.empty()) {
            line->command = arg;
        } else {
            line->operands.push_back(arg);
        }
    }
    return true;
}

namespace {
Zone textZone = Zone::kUtc;
}  // namespace

void SetTextZone(Zone zone)
{
    textZone = zone;
}

Zone TextZone()
{
    return textZone;
}

std::string TextTime(double seconds)
{
    if (textZone == Zone::kUtc)
        return dvrfstool::IsoUtc(seconds);
    return TimeText(static_cast<std::time_t>(seconds), "%Y-%m-%dT%H:%M:%S%z", Zone::kLocal);
}

const char* TextZoneName()
{
    return textZone == Zone::kUtc ? "UTC" : "local time";
}

int UsageError(const std::string& message)
{
    std::fprintf(stderr, "dvrfs: %s\nTry 'dvrfs --help'.\n", message.c_str());
    return kUsageError;
}

ProgressBar::ProgressBar() : shown_(isatty(STDERR_FILENO) != 0) {}

ProgressBar::~ProgressBar()
{
    if (drawn_)
        std::fputc('\n', stderr);
}

void ProgressBar::Show(double fraction)
{
    const auto now = std::chrono::steady_clock::now();
    if (!shown_ || (fraction < 1.0 && now - last_ < std::chrono::milliseconds(100)))
        return;
    last_ = now;
    const int width = 40;
    const int done = static_cast<int>(fraction * width);
    std::fprintf(stderr, "\r[%s%s] %3d%%", std::string(done, '#').c_str(), std::string(width - done, ' ').c_str(),
                 static_cast<int>(fraction * 100));
    drawn_ = true;
}

int CheckOutput(const std::string& disk, const std::string& output, bool force)
{
    struct stat diskInfo {};
    struct stat outputInfo {};
    if (::stat(output.c_str(), &outputInfo) != 0)
        return kOk;
    if (::stat(disk.c_str(), &diskInfo) == 0 && diskInfo.st_dev == outputInfo.st_dev &&
        diskInfo.st_ino == outputInfo.st_ino)
        return UsageError("refusing to write into the disk itself: " + output);
    if (S_ISBLK(outputInfo.st_mode) || S_ISCHR(outputInfo.st_mode))
        return UsageError("refusing to write to a device: " + output);
    if (!force)
        return UsageError(output + " exists; add --force to replace it");
    return kOk;
}

int BuildCatalog(CatalogReader& reader, const std::string& disk)
{
    const CatalogBuild result = reader.BuildCatalog(disk);
    return result == CatalogBuild::kBuilt ? kOk : SayWhyNot(reader.Status(), disk);
}

int SayWhyNot(const dvrfs::VolumeStatus& status, const std::string& disk)
{
    std::fflush(stdout);
    std::fprintf(stderr, "dvrfs: %s: %s", PrintableName(disk).c_str(), dvrfs::DescribeFailure(status).c_str());
    if (status.code != kErrNone || !status.registerText.empty())
        std::fprintf(stderr, " (reader's code %d%s%s)", status.code, status.registerText.empty() ? "" : ": ",
                     status.registerText.c_str());
    std::fputc('\n', stderr);
    return kDiskUnreadable;
}

}  // namespace dvrfscli
