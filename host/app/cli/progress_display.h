// What the user sees while frames render: a bar redrawn in place on a terminal, or one line per
// frame when the output goes to a file or a pipe. An interrupt (Ctrl-C) cancels the render.
#pragma once

#include <cstdint>
#include <ostream>
#include <string>

#include "session/frame_session.h"

namespace ostrel {

// From now on an interrupt cancels the frame in progress instead of ending the program.
void CatchInterrupts();
bool Interrupted();

class ProgressDisplay : public FrameProgress {
public:
    ProgressDisplay(std::ostream& out, bool terminal, int32_t frameCount)
        : out_(out), terminal_(terminal), frameCount_(frameCount) {}
    // Clears the bar, also when a failure ends the run, so that its message starts a line.
    ~ProgressDisplay() override { Clear(); }
    ProgressDisplay(const ProgressDisplay&) = delete;
    ProgressDisplay& operator=(const ProgressDisplay&) = delete;

    void BeginFrame(int32_t frame);
    void EndFrame();
    // Once a frame's file is whole on disk: the seconds the frame took, the layers it rendered
    // and the file. Prints the frame's line when there is no bar.
    void FrameWritten(int32_t frame, double seconds, int32_t layers, const std::string& file);
    // Clears the bar before other lines are printed.
    void Clear();

    bool Renderables(int32_t done, int32_t count) override;
    bool Rows(int32_t row, int32_t count) override;

private:
    void Draw();

    std::ostream& out_;
    bool terminal_;
    int32_t frameCount_;
    int32_t framesDone_ = 0;
    int32_t frame_ = 0;
    double fraction_ = 0;  // of the current frame
    int32_t drawnPercent_ = -1;
};

}  // namespace ostrel
