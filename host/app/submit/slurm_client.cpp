#include "submit/slurm_client.h"

#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <chrono>
#include <cstring>
#include <thread>
#include <vector>

#include "host_error.h"

extern char** environ;

namespace ostrel {
namespace {

struct CommandResult {
    int status = 0;  // the exit status; -1 when the command was ended by a signal
    std::string out;
    std::string err;
};

// A pipe's two ends, closed when it goes.
struct Pipe {
    std::array<int, 2> fd{-1, -1};
    Pipe() {
        if (::pipe2(fd.data(), O_CLOEXEC) != 0)
            throw HostError(std::string("cannot make a pipe: ") + std::strerror(errno));
    }
    ~Pipe() {
        for (int end : fd)
            if (end >= 0) ::close(end);
    }
    Pipe(const Pipe&) = delete;
    Pipe& operator=(const Pipe&) = delete;
    void CloseWriteEnd() {
        ::close(fd[1]);
        fd[1] = -1;
    }
};

// Reads both pipes to their ends; reading one at a time could stall a child that fills the
// other.
void Drain(Pipe& outPipe, Pipe& errPipe, std::string& out, std::string& err) {
    std::array<pollfd, 2> ends{{{outPipe.fd[0], POLLIN, 0}, {errPipe.fd[0], POLLIN, 0}}};
    std::array<std::string*, 2> texts{&out, &err};
    char buffer[4096];
    while (ends[0].fd >= 0 || ends[1].fd >= 0) {
        if (::poll(ends.data(), ends.size(), -1) < 0) {
            if (errno == EINTR) continue;
            break;
        }
        for (size_t i = 0; i < ends.size(); ++i) {
            if (ends[i].fd < 0 || ends[i].revents == 0) continue;
            ssize_t count = ::read(ends[i].fd, buffer, sizeof buffer);
            if (count > 0) {
                texts[i]->append(buffer, static_cast<size_t>(count));
            } else if (count == 0 || errno != EINTR) {
                ends[i].fd = -1;  // poll passes over negative descriptors
            }
        }
    }
}

// A command's message as one line: its lines joined, the last newline dropped.
std::string OneLine(std::string text) {
    while (!text.empty() && (text.back() == '\n' || text.back() == ' '))
        text.pop_back();
    std::replace(text.begin(), text.end(), '\n', ' ');
    return text;
}

// Runs the command, the program found on the PATH, and collects what it prints. Throws HostError
// naming the program when it is not installed.
CommandResult RunCommand(const std::vector<std::string>& command) {
    Pipe outPipe, errPipe;
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addopen(&actions, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
    posix_spawn_file_actions_adddup2(&actions, outPipe.fd[1], STDOUT_FILENO);
    posix_spawn_file_actions_adddup2(&actions, errPipe.fd[1], STDERR_FILENO);
    std::vector<char*> arguments;
    for (const std::string& argument : command)
        arguments.push_back(const_cast<char*>(argument.c_str()));
    arguments.push_back(nullptr);
    pid_t child = 0;
    int error = ::posix_spawnp(&child, arguments[0], &actions, nullptr, arguments.data(), environ);
    posix_spawn_file_actions_destroy(&actions);
    if (error == ENOENT) {
        throw HostError(command[0] +
                        " is not installed (not found on the PATH): submitting needs the "
                        "cluster's Slurm client commands");
    }
    if (error) throw HostError("cannot run " + command[0] + ": " + std::strerror(error));
    outPipe.CloseWriteEnd();
    errPipe.CloseWriteEnd();
    CommandResult result;
    Drain(outPipe, errPipe, result.out, result.err);
    int status = 0;
    while (::waitpid(child, &status, 0) < 0 && errno == EINTR) {
    }
    result.status = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    return result;
}

}  // namespace

std::string SubmitBatch(const std::filesystem::path& script) {
    CommandResult result = RunCommand({"sbatch", "--parsable", script.string()});
    if (result.status != 0) {
        std::string message = OneLine(result.err.empty() ? result.out : result.err);
        throw HostError(script.string() + ": the job was not submitted: " +
                        (message.empty() ? "sbatch failed without a message" : message));
    }
    // "ID" or, on a federation of clusters, "ID;CLUSTER".
    std::string id = OneLine(result.out);
    id = id.substr(0, id.find(';'));
    if (id.empty() || id.find_first_not_of("0123456789") != std::string::npos) {
        throw HostError(script.string() + ": sbatch gave no job id: " + OneLine(result.out));
    }
    return id;
}

void WaitForJob(const std::string& job, std::ostream& out) {
    using Clock = std::chrono::steady_clock;
    constexpr int kAttempts = 5;  // of asking the cluster, before giving up
    Clock::time_point start = Clock::now();
    int failures = 0;
    size_t shown = SIZE_MAX;
    for (;;) {
        CommandResult result =
            RunCommand({"squeue", "--noheader", "--array", "--format=%i", "--jobs=" + job});
        if (result.status == 0) {
            failures = 0;
            auto tasks =
                static_cast<size_t>(std::count(result.out.begin(), result.out.end(), '\n'));
            if (tasks == 0) return;
            if (tasks != shown) {
                out << "job " << job << ": " << tasks << " task" << (tasks == 1 ? "" : "s")
                    << " pending or running\n"
                    << std::flush;
                shown = tasks;
            }
        } else if (result.err.find("Invalid job id") != std::string::npos) {
            return;  // over long enough ago for the cluster to have forgotten it
        } else if (++failures == kAttempts) {
            throw HostError("job " + job + ": cannot follow it: " + OneLine(result.err));
        }
        // A tenth of the time waited so far: short jobs are seen to end soon, long ones are
        // not asked after every second.
        auto pause = std::clamp<Clock::duration>((Clock::now() - start) / 10,
                                                 std::chrono::seconds(1), std::chrono::seconds(30));
        std::this_thread::sleep_for(pause);
    }
}

}  // namespace ostrel
