#include "submit/batch_script.h"

#include <algorithm>
#include <sstream>

namespace ostrel {
namespace {

void Replace(std::string& text, const std::string& from, const std::string& to) {
    for (size_t at = text.find(from); at != std::string::npos; at = text.find(from, at + to.size()))
        text.replace(at, from.size(), to);
}

std::string Frames(FrameRange chunk) {
    std::string text = std::to_string(chunk.first);
    if (chunk.last > chunk.first) text.append("-").append(std::to_string(chunk.last));
    return text;
}

// sbatch reads its directives as words: a value with a space in it is kept whole in quotes.
std::string DirectiveValue(const std::string& value) {
    if (value.find_first_of(" \t") == std::string::npos) return value;
    std::string quoted = "\"";
    quoted.append(value).push_back('"');
    return quoted;
}

}  // namespace

std::vector<FrameRange> SplitFrames(FrameRange range, int32_t size) {
    std::vector<FrameRange> chunks;
    for (int32_t first = range.first; first <= range.last; first += size)
        chunks.push_back({first, std::min(first + size - 1, range.last)});
    return chunks;
}

std::string BatchScript(const BatchJob& job) {
    std::ostringstream script;
    script
        << "#!/bin/bash\n"
        << "# Written by `ostrel submit`. Each array task renders one chunk of frames and leaves\n"
        << "# out those already written: submit it again, or only some tasks with\n"
        << "# `sbatch --array=2,5 SCRIPT`, to render what is missing.\n"
        << "#SBATCH --job-name=" << DirectiveValue(job.name) << '\n'
        << "#SBATCH --array=0-" << job.chunks.size() - 1 << '\n'
        << "#SBATCH --cpus-per-task=" << job.cpusPerTask << '\n'
        << "#SBATCH --output=" << DirectiveValue(job.logPattern.string()) << '\n';
    if (!job.partition.empty())
        script << "#SBATCH --partition=" << DirectiveValue(job.partition) << '\n';
    if (!job.timeLimit.empty())
        script << "#SBATCH --time=" << DirectiveValue(job.timeLimit) << '\n';
    if (!job.memory.empty()) script << "#SBATCH --mem=" << DirectiveValue(job.memory) << '\n';
    script << "set -euo pipefail\n"
           << "chunks=(";
    for (size_t i = 0; i < job.chunks.size(); ++i)
        script << (i ? " " : "") << Frames(job.chunks[i]);
    script << ")\n"
           << "exec";
    for (const std::string& word : job.render)
        script << ' ' << ShellQuoted(word);
    script << " --skip-existing --keep-going --threads \"${SLURM_CPUS_PER_TASK:-1}\" \\\n"
           << "    --frames \"${chunks[$SLURM_ARRAY_TASK_ID]}\"\n";
    return script.str();
}

std::filesystem::path TaskLog(const BatchJob& job, const std::string& jobId,
                              const std::string& task) {
    std::string log = job.logPattern.string();
    Replace(log, "%A", jobId);
    Replace(log, "%a", task);
    return log;
}

std::string ShellQuoted(const std::string& text) {
    constexpr char kPlain[] =
        "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789_-+=/.,:";
    if (!text.empty() && text.find_first_not_of(kPlain) == std::string::npos) return text;
    std::string quoted = "'";
    for (char c : text) {
        if (c == '\'') {
            quoted.append("'\\''");  // close the quotes, an escaped quote, open them again
        } else {
            quoted.push_back(c);
        }
    }
    quoted.push_back('\'');
    return quoted;
}

}  // namespace ostrel
