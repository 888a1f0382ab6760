#include "bench/whole/ScalingRun.h"

#include <chrono>
#include <cstdio>
#include <stdexcept>
#include <string>
#include <vector>

#include <boost/json.hpp>

#include "bench/whole/CommandRun.h"
#include "bench/whole/SearchCheck.h"
#include "bench/whole/ServeProcess.h"

namespace wholebench {

namespace {

namespace fs = std::filesystem;

const int kSizes[] = {1000, 10000};
const std::size_t kFileSize = 512;
const int kRounds = 3;
// A round slower than this is not repeated, so that the run stays bearable
// while the large size is slow; the table says so.
const double kRepeatBelowSeconds = 30;
const char* const kSteps[] = {"first upload", "nothing changed", "download into an empty folder"};
const int kStepCount = 3;

struct StepCost {
    double mWall = 0;
    double mClientCpu = 0;
    double mClientPeakMiB = 0;
    double mServiceCpu = 0;
};

// One round for `files` files: the three steps, each as a whole process,
// against a service of the round's own.
std::vector<StepCost> RunRound(const fs::path& root, int files)
{
    std::vector<StepCost> steps;
    {
        ServeProcess serve(root / "service");
        WriteSmallFiles(root / "up", files, kFileSize, 0);
        fs::create_directories(root / "down");
        const auto syncOf = [&](const char* folder, const char* pref) {
            return std::vector<std::string>{
                "--app", "Scaling", "--pref-dir", (root / pref).string(),
                "sync",  "-q",      "--dir",      "path=" + (root / folder).string() + ",group=Scaling,ext=.bin"};
        };
        const std::vector<std::string> commands[kStepCount] = {syncOf("up", "pref-up"), syncOf("up", "pref-up"),
                                                               syncOf("down", "pref-down")};
        for (const std::vector<std::string>& command : commands) {
            const double serviceBefore = serve.CpuSeconds();
            const CommandCost cost = RunSync(serve.Api(), root / "scratch", command);
            steps.push_back({cost.mWallSeconds, cost.mCpuSeconds, cost.mPeakMiB, serve.CpuSeconds() - serviceBefore});
        }
    }
    long downloaded = 0;
    for (const auto& entry : fs::directory_iterator(root / "down")) downloaded += entry.path().extension() == ".bin";
    if (downloaded != files)
        throw std::runtime_error("scaling: " + std::to_string(downloaded) + " of " + std::to_string(files) +
                                 " files came down");
    RemoveUnlessKept(root);
    return steps;
}

StepCost MedianOf(const std::vector<StepCost>& rounds)
{
    std::vector<double> wall, cpu, peak, service;
    for (const StepCost& cost : rounds) {
        wall.push_back(cost.mWall);
        cpu.push_back(cost.mClientCpu);
        peak.push_back(cost.mClientPeakMiB);
        service.push_back(cost.mServiceCpu);
    }
    return {Median(wall), Median(cpu), Median(peak), Median(service)};
}

const char* Verdict(bool ok)
{
    return ok ? "ok" : "MISSED";
}

boost::json::object StepJson(const char* step, int files, int rounds, const StepCost& cost)
{
    return {{"name", step},
            {"files", files},
            {"rounds", rounds},
            {"seconds", cost.mWall},
            {"clientCpuSeconds", cost.mClientCpu},
            {"clientPeakMiB", cost.mClientPeakMiB},
            {"serviceCpuSeconds", cost.mServiceCpu}};
}

}  // namespace

boost::json::object RunScaling(const fs::path& work)
{
    // medians[size][step], and how many rounds each size had
    std::vector<std::vector<StepCost> > medians;
    std::vector<int> roundsRun;
    for (const int files : kSizes) {
        std::vector<std::vector<StepCost> > byStep(kStepCount);
        int rounds = 0;
        while (rounds < kRounds) {
            const auto start = std::chrono::steady_clock::now();
            const std::vector<StepCost> steps =
                RunRound(work / ("scaling-" + std::to_string(files) + "-" + std::to_string(rounds)), files);
            for (int step = 0; step < kStepCount; ++step) byStep[step].push_back(steps[step]);
            ++rounds;
            if (std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count() > kRepeatBelowSeconds)
                break;
        }
        std::vector<StepCost> sizeMedians;
        for (const std::vector<StepCost>& step : byStep) sizeMedians.push_back(MedianOf(step));
        medians.push_back(sizeMedians);
        roundsRun.push_back(rounds);
    }

    std::printf("\nscaling: the command as whole processes against serve, files of %zu bytes, one group\n", kFileSize);
    std::printf("(medians of %d rounds for 1,000 files and %d for 10,000; a round over %.0f s is not repeated)\n",
                roundsRun[0], roundsRun[1], kRepeatBelowSeconds);
    std::printf("%-31s %6s %8s %11s %11s %12s  %s\n", "step", "files", "wall s", "client CPU", "client MiB",
                "service CPU", "goals");
    boost::json::array rows;
    for (int step = 0; step < kStepCount; ++step) {
        const StepCost& small = medians[0][step];
        const StepCost& large = medians[1][step];
        for (int size = 0; size < 2; ++size) {
            const StepCost& cost = medians[size][step];
            std::string goals;
            if (size == 0 && step == 1) goals = std::string("wall < 0.12 s ") + Verdict(cost.mWall < 0.12);
            if (size == 1) goals = std::string("client peak < 64 MiB ") + Verdict(cost.mClientPeakMiB < 64);
            std::printf("%-31s %6d %8.3f %11.3f %11.1f %12.3f  %s\n", kSteps[step], kSizes[size], cost.mWall,
                        cost.mClientCpu, cost.mClientPeakMiB, cost.mServiceCpu, goals.c_str());
            rows.push_back(StepJson(kSteps[step], kSizes[size], roundsRun[size], cost));
        }
        const double wallRatio = large.mWall / small.mWall;
        const double cpuRatio = large.mClientCpu / small.mClientCpu;
        const double serviceRatio = large.mServiceCpu / small.mServiceCpu;
        std::printf("%-31s 10,000/1,000: wall %.1fx %s, client CPU %.1fx %s, service CPU %.1fx %s (each <= 11x)\n", "",
                    wallRatio, Verdict(wallRatio <= 11), cpuRatio, Verdict(cpuRatio <= 11), serviceRatio,
                    Verdict(serviceRatio <= 11));
    }
    boost::json::object figures{{"rows", rows}};
    figures["search"] = RunSearchCheck(work / "search");
    return figures;
}

}  // namespace wholebench
