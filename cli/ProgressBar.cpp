#include "cli/ProgressBar.h"

#include <algorithm>
#include <cmath>
#include <sstream>

namespace tolmonetsync {
namespace cli {

namespace {

std::string BarText(const char* label, float fraction)
{
    const int width = 30;
    const float clamped = std::min(1.0f, std::max(0.0f, fraction));
    const int filled = static_cast<int>(clamped * width);
    return std::string(label) + " [" + std::string(filled, '#') + std::string(width - filled, '.') + "] " +
           std::to_string(static_cast<int>(clamped * 100)) + "%";
}

}  // namespace

std::string ByteCountText(std::uint64_t bytes)
{
    const char* units[] = {"bytes", "KiB", "MiB", "GiB", "TiB"};
    double value = static_cast<double>(bytes);
    std::size_t unit = 0;
    while (value >= 1024 && unit + 1 < sizeof(units) / sizeof(units[0])) {
        value /= 1024;
        ++unit;
    }
    std::ostringstream text;
    text.setf(std::ios::fixed);
    text.precision(unit == 0 ? 0 : 1);
    text << value << " " << units[unit];
    return text.str();
}

void ProgressBar::Draw(const char* label, float fraction)
{
    if (mShown) Show(BarText(label, fraction));
}

void ProgressBar::DrawTransfer(const char* label, float fraction, std::size_t total, std::uint64_t bytes,
                               double seconds)
{
    if (!mShown) return;
    const float clamped = std::min(1.0f, std::max(0.0f, fraction));
    const auto done = static_cast<std::size_t>(std::lround(clamped * static_cast<double>(total)));
    const auto rate = static_cast<std::uint64_t>(seconds > 0 ? static_cast<double>(bytes) / seconds : 0);
    Show(BarText(label, fraction) + " " + std::to_string(done) + "/" + std::to_string(total) + " files, " +
         ByteCountText(bytes) + " at " + ByteCountText(rate) + "/s");
}

void ProgressBar::Show(const std::string& line)
{
    // Pad over whatever longer line was there before.
    const std::size_t width = std::max(line.size(), mDrawnWidth);
    mOut << "\r" << line << std::string(width - line.size(), ' ') << std::flush;
    mDrawnWidth = width;
}

void ProgressBar::Clear()
{
    if (mDrawnWidth == 0) return;
    mOut << "\r" << std::string(mDrawnWidth, ' ') << "\r" << std::flush;
    mDrawnWidth = 0;
}

}  // namespace cli
}  // namespace tolmonetsync
