// Slurm's client commands, run as child processes: submitting a batch script and following the
// job it makes.
#pragma once

#include <filesystem>
#include <ostream>
#include <string>

namespace ostrel {

// Submits the batch script and returns the job's id. Throws HostError naming the script, with
// sbatch's own message (the cluster's, when it refuses the job), when it is not submitted.
std::string SubmitBatch(const std::filesystem::path& script);

// Returns when no task of the job is left pending or running, telling out how many are whenever
// that changes. The cluster is asked again after a pause that grows with the wait, to at most
// half a minute. Throws HostError when the cluster cannot be asked several times running.
void WaitForJob(const std::string& job, std::ostream& out);

}  // namespace ostrel
