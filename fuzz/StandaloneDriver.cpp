// Runs a fuzz target without libFuzzer, for a few seconds in every test run:
// each seed as it is, then random mutations of the seeds and random texts
// drawn from the characters parsers care about. No coverage guidance, so it
// finds only shallow faults; `./dev fuzz` is the real search.
//
//   NAME_smoke SECONDS SEED_DIRECTORY

#include <chrono>
#include <csignal>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <random>
#include <string>
#include <vector>

#include <unistd.h>

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size);

namespace {

const char kAlphabet[] = "{}[]\":,.-+eE0123456789 \\/\ttrue false null uU=_%\x00\xc3\xa9\xff\n";

std::vector<std::string> ReadSeeds(const std::filesystem::path& directory)
{
    std::vector<std::string> seeds;
    std::error_code error;
    for (std::filesystem::directory_iterator it(directory, error), end; !error && it != end; it.increment(error)) {
        std::ifstream stream(it->path(), std::ios::binary);
        seeds.emplace_back(std::istreambuf_iterator<char>(stream), std::istreambuf_iterator<char>());
    }
    return seeds;
}

std::string Mutate(std::string text, std::mt19937& random)
{
    const int edits = 1 + static_cast<int>(random() % 4);
    for (int i = 0; i < edits; ++i) {
        const char c = kAlphabet[random() % (sizeof kAlphabet - 1)];
        const std::size_t at = text.empty() ? 0 : random() % (text.size() + 1);
        switch (random() % 4) {
            case 0:
                text.insert(text.begin() + static_cast<long>(at), c);
                break;
            case 1:
                if (at < text.size()) text.erase(at, 1 + random() % 8);
                break;
            case 2:
                if (at < text.size()) text[at] = c;
                break;
            default:
                text = text.substr(0, at);
                break;
        }
    }
    return text;
}

std::string RandomText(std::mt19937& random)
{
    std::string text(random() % 64, ' ');
    for (char& c : text) c = kAlphabet[random() % (sizeof kAlphabet - 1)];
    return text;
}

// The input being run, shown if it brings the process down.
const std::string* sCurrent = nullptr;

void ShowInputAndDie(int signal)
{
    static const char kHeader[] = "\nfuzz smoke: the input that failed, in hex:\n";
    if (write(2, kHeader, sizeof kHeader - 1) < 0) _exit(1);
    static const char kDigits[] = "0123456789abcdef";
    if (sCurrent != nullptr) {
        for (unsigned char c : *sCurrent) {
            const char pair[2] = {kDigits[c >> 4], kDigits[c & 15]};
            if (write(2, pair, 2) < 0) _exit(1);
        }
    }
    if (write(2, "\n", 1) < 0) _exit(1);
    std::signal(signal, SIG_DFL);
    std::raise(signal);
}

int Run(const std::string& input)
{
    sCurrent = &input;
    const int result = LLVMFuzzerTestOneInput(reinterpret_cast<const std::uint8_t*>(input.data()), input.size());
    sCurrent = nullptr;
    return result;
}

}  // namespace

int main(int argc, char** argv)
{
    if (argc != 3) {
        std::fprintf(stderr, "usage: %s SECONDS SEED_DIRECTORY\n", argv[0]);
        return 2;
    }
    for (int signal : {SIGABRT, SIGSEGV, SIGBUS, SIGFPE}) std::signal(signal, ShowInputAndDie);
    const auto until = std::chrono::steady_clock::now() + std::chrono::seconds(std::atoi(argv[1]));
    const std::vector<std::string> seeds = ReadSeeds(argv[2]);
    for (const std::string& seed : seeds) Run(seed);
    std::mt19937 random(std::random_device{}());
    long runs = 0;
    while (std::chrono::steady_clock::now() < until) {
        if (!seeds.empty() && random() % 4 != 0)
            Run(Mutate(seeds[random() % seeds.size()], random));
        else
            Run(RandomText(random));
        ++runs;
    }
    std::printf("%ld inputs from %zu seeds without a fault\n", runs, seeds.size());
    return 0;
}
