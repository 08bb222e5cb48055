// The batch script of a job that renders a range of frames on a cluster: one array task per
// chunk of frames, each a `render` of its chunk that leaves out the frames already written.
#pragma once

#include <cstdint>
#include <filesystem>
#include <string>
#include <vector>

#include "cli/arguments.h"

namespace ostrel {

struct BatchJob {
    std::string name;
    std::vector<FrameRange> chunks;    // task i renders chunks[i]
    std::vector<std::string> render;   // the program and its arguments, without the frames
    std::filesystem::path logPattern;  // %A becomes the job id, %a the task's index
    int32_t cpusPerTask = 1;           // also the task's render threads
    std::string partition;             // empty: the cluster's default, and so on
    std::string timeLimit;
    std::string memory;
};

// The range cut into chunks of at most size frames, in order.
std::vector<FrameRange> SplitFrames(FrameRange range, int32_t size);

std::string BatchScript(const BatchJob& job);

// The log file of a task, given its index ("*" names them all for a shell).
std::filesystem::path TaskLog(const BatchJob& job, const std::string& jobId,
                              const std::string& task);

// The text as one word for a shell, whatever it holds: in single quotes unless it is plain.
std::string ShellQuoted(const std::string& text);

}  // namespace ostrel
