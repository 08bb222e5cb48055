#include "cli/progress_display.h"

#include <csignal>
#include <cstdio>

namespace ostrel {
namespace {

volatile std::sig_atomic_t gInterrupted = 0;

extern "C" void OnInterrupt(int) {
    gInterrupted = 1;
}

constexpr int kBarWidth = 30;

}  // namespace

void CatchInterrupts() {
    std::signal(SIGINT, &OnInterrupt);
}

bool Interrupted() {
    return gInterrupted != 0;
}

void ProgressDisplay::BeginFrame(int32_t frame) {
    frame_ = frame;
    fraction_ = 0;
    drawnPercent_ = -1;
    Draw();
}

void ProgressDisplay::EndFrame() {
    ++framesDone_;
    fraction_ = 0;
}

void ProgressDisplay::FrameWritten(int32_t frame, double seconds, int32_t layers,
                                   const std::string& file) {
    if (terminal_) return;
    char line[64];
    std::snprintf(line, sizeof line, "frame %d: %.3f s, %d layer%s -> ", frame, seconds, layers,
                  layers == 1 ? "" : "s");
    out_ << line << file << '\n' << std::flush;
}

void ProgressDisplay::Clear() {
    if (!terminal_ || drawnPercent_ < 0) return;
    out_ << '\r' << std::string(kBarWidth + 40, ' ') << '\r' << std::flush;
    drawnPercent_ = -1;
}

bool ProgressDisplay::Renderables(int32_t done, int32_t count) {
    if (count > 0) fraction_ = static_cast<double>(done) / count;
    Draw();
    return !Interrupted();
}

// Called by the renderer's first thread only.
bool ProgressDisplay::Rows(int32_t, int32_t) {
    return !Interrupted();
}

void ProgressDisplay::Draw() {
    if (!terminal_) return;
    double total = (framesDone_ + fraction_) / frameCount_;
    auto percent = static_cast<int32_t>(total * 100);
    if (percent == drawnPercent_) return;
    drawnPercent_ = percent;
    auto filled = static_cast<int>(total * kBarWidth);
    char line[kBarWidth + 64];
    std::snprintf(line, sizeof line, "\r[%s%s] %3d%%  frame %d (%d of %d)",
                  std::string(static_cast<size_t>(filled), '#').c_str(),
                  std::string(static_cast<size_t>(kBarWidth - filled), '.').c_str(), percent,
                  frame_, framesDone_ + 1, frameCount_);
    out_ << line << std::flush;
}

}  // namespace ostrel
