// Slurm's client commands, run as child processes: submitting a batch script and following the
// job it makes.
#pragma once

#include <filesystem>
#include <ostream>
#include <string>
#include <vector>

namespace ostrel {

struct CommandResult {
    int status = 0;  // the exit status; -1 when the command was ended by a signal
    std::string out;
    std::string err;
};

// Runs the command, the program found on the PATH, and collects what it prints. Throws HostError
// naming the program when it is not installed.
CommandResult RunCommand(const std::vector<std::string>& command);

// Submits the batch script and returns the job's id. Throws HostError naming the script, with
// sbatch's own message (the cluster's, when it refuses the job), when it is not submitted.
std::string SubmitBatch(const std::filesystem::path& script);

// Returns when no task of the job is left pending or running, telling out how many are whenever
// that changes. The cluster is asked again after a pause that grows with the wait, to at most
// half a minute. Throws HostError when the cluster cannot be asked several times running.
void WaitForJob(const std::string& job, std::ostream& out);

}  // namespace ostrel
