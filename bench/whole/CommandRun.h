#pragma once
// The `tolmonetsync` command run as a whole process, with what it cost: wall
// time, processor time and peak memory from its own rusage.

#include <filesystem>
#include <string>
#include <vector>

namespace wholebench {

struct CommandCost {
    double mWallSeconds = 0;
    double mCpuSeconds = 0;  // user and system
    double mPeakMiB = 0;     // maximum resident set size
    std::string mOut;        // what it printed on stdout
};

// Runs `tolmonetsync SYNC_ARGUMENTS...` with the options that reach the
// service at `api` with the bench token (its file under `scratch`); throws
// with the command's stderr if it fails.
CommandCost RunSync(const std::string& api, const std::filesystem::path& scratch,
                    const std::vector<std::string>& arguments);

// `count` files "f10000.bin"... of `size` bytes in `folder`, their bytes
// varying with the file and with `salt`.
void WriteSmallFiles(const std::filesystem::path& folder, int count, std::size_t size, int salt);

// Removes a finished part's folders, unless WHOLE_BENCH_KEEP is set (for a
// look at what a run left behind).
void RemoveUnlessKept(const std::filesystem::path& path);

// The median of three or fewer figures (the middle one, or the mean of two).
double Median(std::vector<double> figures);

}  // namespace wholebench
