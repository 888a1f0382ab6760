// Whole syncs through the library against the local service on loopback:
// seconds beside the floor a plain libcurl loop reaches for the same requests
// (and, for downloads, the floor of a naive safe writer), and the client's
// peak memory; medians of three rounds, each on a service of its own. The
// service runs in a process of its own and every scenario in a child process
// of this one, so that each peak is the client's alone. Then the scaling run
// of the command as whole processes.
//
//   tolmonetsync_whole_bench [RAW_FIGURES_FILE]

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <stdexcept>
#include <string>
#include <vector>

#include <boost/json.hpp>

#include "bench/whole/CommandRun.h"
#include "bench/whole/FloorLoop.h"
#include "bench/whole/LibraryRun.h"
#include "bench/whole/ScalingRun.h"
#include "bench/whole/ServeProcess.h"

namespace {

namespace fs = std::filesystem;
using namespace wholebench;

const int kRounds = 3;
const int kSmallFiles = 1000;
const int kSmallSize = 4 * 1024;
const int kChanged = 100;
const int kLargeFiles = 10;
const std::uint64_t kLargeSize = 16ull * 1024 * 1024;
const std::uint64_t kLargeLimit = kLargeSize + 1;  // a file of exactly this size is not uploaded
const long kParallel = 6;                          // the processor's connections per host
const double kMiB = 1024.0 * 1024.0;

// ---- the floor ----

struct ItemList {
    std::string mGroupId;
    std::vector<std::pair<std::string, std::string> > mItems;  // id, quoted tag
};

ItemList ReadItems(const fs::path& path)
{
    ItemList list;
    std::ifstream stream(path);
    std::getline(stream, list.mGroupId);
    std::string id, etag;
    while (stream >> id >> etag) list.mItems.emplace_back(id, etag);
    return list;
}

std::string Bearer()
{
    return std::string("Authorization: Bearer ") + kBenchToken;
}

// Downloads write each body to a file of its own in `saveIn`, as the library must.
double FloorGets(const std::string& api, const ItemList& list, bool conditional, const fs::path& saveIn,
                 Saving saving = Saving::Plain)
{
    fs::create_directories(saveIn);
    std::vector<FloorRequest> requests;
    for (const auto& item : list.mItems) {
        FloorRequest request{"GET", api + "/assets/" + item.first, {Bearer()}, nullptr,
                             200,   (saveIn / item.first).string()};
        if (conditional) {
            request.mHeaders.push_back("If-None-Match: " + item.second);
            request.mExpectStatus = 304;
            request.mSaveAs.clear();
        }
        requests.push_back(request);
    }
    return RunFloor(requests, kParallel, saving);
}

double FloorSmall(const std::string& api, const ItemList& list)
{
    std::vector<FloorRequest> requests;
    for (const auto& item : list.mItems)
        requests.push_back({"GET", api + "/assets/" + item.first + "/metadata", {Bearer()}, nullptr, 200, ""});
    return RunFloor(requests, kParallel);
}

double FloorUploads(const std::string& api, const std::string& groupId, const std::string& body, int count,
                    const std::string& prefix)
{
    // collections=["/api/collections/ID"], quoted
    const std::string collections = "%5B%22%2Fapi%2Fcollections%2F" + groupId + "%22%5D";
    std::vector<FloorRequest> requests;
    for (int i = 0; i < count; ++i)
        requests.push_back({"POST",
                            api + "/assets?name=" + prefix + std::to_string(i) + ".floor&collections=" + collections,
                            {Bearer(), "Content-Type: application/octet-stream"},
                            &body,
                            201,
                            ""});
    return RunFloor(requests, kParallel);
}

// Requests per second by kind, measured on one round's service.
struct FloorRates {
    double mConditional = 0, mDownload = 0, mDurableDownload = 0, mSmall = 0, mUpload = 0;
    double mLargeDownload = 0, mLargeDurableDownload = 0, mLargeUpload = 0;
};

FloorRates MeasureFloors(const std::string& api, const fs::path& root)
{
    const ItemList smallItems = ReadItems(root / "small-items.txt");
    const ItemList largeItems = ReadItems(root / "large-items.txt");
    const double n = static_cast<double>(smallItems.mItems.size());
    const double large = static_cast<double>(largeItems.mItems.size());
    FloorRates rates;
    rates.mConditional = n / FloorGets(api, smallItems, true, root / "floor-conditional");
    rates.mDownload = n / FloorGets(api, smallItems, false, root / "floor-small");
    rates.mDurableDownload = n / FloorGets(api, smallItems, false, root / "floor-small-durable", Saving::Durable);
    rates.mSmall = n / FloorSmall(api, smallItems);
    const std::string smallBody(kSmallSize, 'f');
    rates.mUpload = kSmallFiles / FloorUploads(api, smallItems.mGroupId, smallBody, kSmallFiles, "s");
    rates.mLargeDownload = large / FloorGets(api, largeItems, false, root / "floor-large");
    rates.mLargeDurableDownload =
        large / FloorGets(api, largeItems, false, root / "floor-large-durable", Saving::Durable);
    const std::string largeBody(kLargeSize, 'F');
    rates.mLargeUpload = kLargeFiles / FloorUploads(api, largeItems.mGroupId, largeBody, kLargeFiles, "l");
    return rates;
}

// ---- the rows ----

void WriteFiles(const fs::path& folder, int count, std::uint64_t size, const std::string& salt)
{
    fs::create_directories(folder);
    for (int i = 0; i < count; ++i) {
        std::string bytes(size, '\0');
        for (std::uint64_t at = 0; at < size; at += 64)
            bytes[at] = static_cast<char>((i * 131 + at / 64 + salt.size()) & 0xff);
        bytes.replace(0, std::min<std::size_t>(bytes.size(), salt.size()), salt.substr(0, bytes.size()));
        std::ofstream(folder / ("f" + std::to_string(10000 + i) + ".bin"), std::ios::binary) << bytes;
    }
}

long Count(const boost::json::object& figures, const char* kind)
{
    const auto& counts = figures.at("counts").as_object();
    return counts.contains(kind) ? static_cast<long>(counts.at(kind).as_int64()) : 0;
}

// One row of one round: the library's figures with its floors added.
struct RowRun {
    std::string mName;
    bool mLarge = false;
    boost::json::object mFigures;
};

const char* const kRowNames[] = {
    "first upload, 1,000 x 4 KiB",         "two-way, nothing changed", "after 100 local changes",
    "download 1,000 into an empty folder", "10 x 16 MiB up",           "10 x 16 MiB down"};
const int kRowCount = 6;

// The six rows on a service of their own, then the floors on the same service.
std::vector<RowRun> RunRound(const fs::path& root, int round, boost::json::array& floorFigures)
{
    std::vector<RowRun> rows;
    ServeProcess serve(root / "service");
    const std::string& api = serve.Api();
    const auto run = [&](const Setup& setup, bool large) {
        rows.push_back({kRowNames[rows.size()], large, SyncInChild(setup)});
    };

    WriteFiles(root / "a", kSmallFiles, kSmallSize, "first");
    const Setup small{api, root / "a", root / "pref-a", "Small", kSmallSize * 16, {}};
    run(small, false);
    run(small, false);
    for (int i = 0; i < kChanged; ++i)
        std::ofstream(root / "a" / ("f" + std::to_string(10000 + i * (kSmallFiles / kChanged)) + ".bin"),
                      std::ios::binary)
            << std::string(kSmallSize, 'c');
    run(small, false);
    fs::create_directories(root / "b");
    run({api, root / "b", root / "pref-b", "Small", kSmallSize * 16, root / "small-items.txt"}, false);

    WriteFiles(root / "c", kLargeFiles, kLargeSize, "large");
    WriteFiles(root / "c-limit", 1, kLargeLimit, "limit");
    fs::rename(root / "c-limit" / "f10000.bin", root / "c" / "limit.bin");
    run({api, root / "c", root / "pref-c", "Large", kLargeLimit, {}, u"WholeSyncLarge"}, true);
    fs::create_directories(root / "d");
    run({api, root / "d", root / "pref-d", "Large", kLargeLimit, root / "large-items.txt", u"WholeSyncLarge"}, true);
    if (rows[4].mFigures.at("uploaded").as_int64() != kLargeFiles || fs::exists(root / "d" / "limit.bin"))
        throw std::runtime_error("the file at the size limit was uploaded");

    const FloorRates rates = MeasureFloors(api, root);
    for (RowRun& row : rows) {
        const boost::json::object& figures = row.mFigures;
        const double others = Count(figures, "conditional") / rates.mConditional +
                              Count(figures, "upload") / (row.mLarge ? rates.mLargeUpload : rates.mUpload) +
                              Count(figures, "small") / rates.mSmall;
        const double downloads = static_cast<double>(Count(figures, "download"));
        row.mFigures["name"] = row.mName;
        row.mFigures["round"] = round;
        row.mFigures["floorSeconds"] = others + downloads / (row.mLarge ? rates.mLargeDownload : rates.mDownload);
        if (downloads > 0)
            row.mFigures["durableFloorSeconds"] =
                others + downloads / (row.mLarge ? rates.mLargeDurableDownload : rates.mDurableDownload);
    }
    floorFigures.push_back({{"round", round},
                            {"conditional", rates.mConditional},
                            {"download", rates.mDownload},
                            {"durableDownload", rates.mDurableDownload},
                            {"small", rates.mSmall},
                            {"upload", rates.mUpload},
                            {"largeDownload", rates.mLargeDownload},
                            {"largeDurableDownload", rates.mLargeDurableDownload},
                            {"largeUpload", rates.mLargeUpload}});
    return rows;
}

// ---- the table ----

double MedianOf(const std::vector<RowRun>& runs, const char* key)
{
    std::vector<double> figures;
    for (const RowRun& run : runs)
        if (run.mFigures.contains(key)) figures.push_back(run.mFigures.at(key).to_number<double>());
    return Median(figures);
}

const char* Verdict(bool ok)
{
    return ok ? "ok" : "MISSED";
}

// Prints the row's medians and goals; gives the medians as JSON.
boost::json::object ReportRow(const std::vector<RowRun>& runs)
{
    const RowRun& first = runs.front();
    const double seconds = MedianOf(runs, "seconds");
    const double floor = MedianOf(runs, "floorSeconds");
    const double durable = MedianOf(runs, "durableFloorSeconds");
    const double peak = MedianOf(runs, "peakMiB");
    const double ratio = floor / seconds;
    const double durableRatio = durable / seconds;
    std::ostringstream goals;
    if (durable > 0)
        goals << "durable >= 100% " << Verdict(durableRatio >= 1) << ", floor >= 50% " << Verdict(ratio >= 0.5);
    else
        goals << "floor >= 80% " << Verdict(ratio >= 0.8);
    if (first.mLarge) {
        goals << ", peak < 96 MiB " << Verdict(peak < 96);
        const double rate = kLargeFiles * kLargeSize / kMiB / seconds;
        goals << ", " << static_cast<int>(rate) << " MiB/s";
        if (durable > 0)
            goals << " > 790 " << Verdict(rate > 790) << ", durable floor "
                  << static_cast<int>(kLargeFiles * kLargeSize / kMiB / durable) << " MiB/s";
    }
    char durableText[32] = "-";
    if (durable > 0) std::snprintf(durableText, sizeof durableText, "%.3f %5.0f%%", durable, 100 * durableRatio);
    std::printf("%-37s %7.3f %6.0f %7.3f %5.0f%% %14s %8.1f  %s\n", first.mName.c_str(), seconds,
                MedianOf(runs, "requests"), floor, 100 * ratio, durableText, peak, goals.str().c_str());
    boost::json::object medians{{"name", first.mName},
                                {"seconds", seconds},
                                {"floorSeconds", floor},
                                {"peakMiB", peak},
                                {"uploaded", first.mFigures.at("uploaded")},
                                {"downloaded", first.mFigures.at("downloaded")}};
    if (durable > 0) medians["durableFloorSeconds"] = durable;
    return medians;
}

double SecondsSince(std::chrono::steady_clock::time_point start)
{
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
}

}  // namespace

int main(int argc, char** argv)
{
    const fs::path raw = argc > 1 ? fs::path(argv[1]) : fs::path("bench-whole-sync.json");
    char pattern[] = "/tmp/tolmonetsync-whole-bench-XXXXXX";
    if (mkdtemp(pattern) == nullptr) return 1;
    const fs::path work = pattern;
    int status = 0;
    try {
        const auto start = std::chrono::steady_clock::now();
        std::vector<std::vector<RowRun> > byRow(kRowCount);
        boost::json::array runs, floors;
        for (int round = 0; round < kRounds; ++round) {
            const fs::path root = work / ("round-" + std::to_string(round));
            const std::vector<RowRun> rows = RunRound(root, round, floors);
            RemoveUnlessKept(root);
            for (int row = 0; row < kRowCount; ++row) {
                byRow[row].push_back(rows[row]);
                runs.push_back(rows[row].mFigures);
            }
        }

        std::printf("whole sync, medians of %d rounds (ratio: floor seconds / seconds)\n", kRounds);
        std::printf("%-37s %7s %6s %7s %6s %14s %8s  %s\n", "row", "seconds", "reqs", "floor", "ratio", "durable ratio",
                    "peak MiB", "goals");
        boost::json::array medians;
        for (const std::vector<RowRun>& row : byRow) medians.push_back(ReportRow(row));
        std::printf("whole-sync rows took %.0f s\n", SecondsSince(start));

        const auto scalingStart = std::chrono::steady_clock::now();
        const boost::json::object scaling = RunScaling(work);
        std::printf("scaling run took %.0f s\n", SecondsSince(scalingStart));

        std::ofstream(raw) << boost::json::serialize(boost::json::object{{"runs", runs},
                                                                         {"medians", medians},
                                                                         {"floorRequestsPerSecond", floors},
                                                                         {"scaling", scaling}})
                           << "\n";
        std::printf("raw figures: %s\n", fs::absolute(raw).string().c_str());
    } catch (const std::exception& e) {
        std::fprintf(stderr, "whole-sync bench: %s\n", e.what());
        status = 1;
    }
    std::error_code error;
    if (!std::getenv("WHOLE_BENCH_KEEP")) fs::remove_all(work, error);
    return status;
}
