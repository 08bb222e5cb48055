// `ostrel options` driven through a pseudo-terminal, as a person drives it.
#include <gtest/gtest.h>
#include <poll.h>
#include <pty.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>
#include <vector>

#include "test_files.h"

namespace ostrel {
namespace {

namespace fs = std::filesystem;

std::string ReadAll(const fs::path& file) {
    std::stringstream text;
    text << std::ifstream(file).rdbuf();
    return text.str();
}

// Runs the program on a terminal of its own in folder and types each key once the dialog is
// drawn, a tenth of a second apart (an Escape alone is told from an arrow by the pause).
// Returns what the terminal showed.
std::string OnTerminal(const fs::path& folder, const std::string& arguments,
                       const std::vector<std::string>& keys) {
    int terminal = -1;
    pid_t child = ::forkpty(&terminal, nullptr, nullptr, nullptr);
    if (child == 0) {
        std::string command = "cd '" + folder.string() + "' && '" OSTREL_PROGRAM "' " + arguments;
        ::execl("/bin/sh", "sh", "-c", command.c_str(), nullptr);
        ::_exit(127);
    }
    std::string screen;
    // Reads for up to `wait` tenths of a second, or until the program is done.
    auto read = [&](int wait, const char* until) {
        for (; wait > 0 && screen.find(until) == std::string::npos; --wait) {
            pollfd in{terminal, POLLIN, 0};
            char buffer[4096];
            ssize_t n = ::poll(&in, 1, 100) == 1 ? ::read(terminal, buffer, sizeof buffer) : 0;
            if (n < 0) return;
            screen.append(buffer, static_cast<size_t>(n));
        }
    };
    read(100, "[Cancel]");
    for (const std::string& key : keys) {
        EXPECT_EQ(::write(terminal, key.data(), key.size()), static_cast<ssize_t>(key.size()));
        read(1, "\x01");
    }
    read(100, "\x01");
    int status = -1;
    ::waitpid(child, &status, 0);
    ::close(terminal);
    return screen + "exit " + std::to_string(WIFEXITED(status) ? WEXITSTATUS(status) : -1);
}

TEST(OptionsProgram, DialogOnATerminalWritesTheChoiceIntoTheComposition) {
    const std::string kUp = "\x1b[A", kDown = "\x1b[B", kEnter = "\r", kEscape = "\x1b";
    struct Case {
        const char* name;
        std::vector<std::string> keys;
        const char* printed;  // the last line
        const char* info;     // the shadow map line of `ostrel info` afterwards
    };
    const Case kCases[] = {
        {"down to 750, OK",
         {kUp, kDown, kDown, kDown, kEnter},
         "shots.json: shadow map resolution 750",
         "shadow maps  750 pixels"},
        {"moved, then cancelled",
         {kDown, kEscape},
         "shots.json: unchanged",
         "shadow maps  Comp Size"},
        {"OK without a change", {kEnter}, "shots.json: unchanged", "shadow maps  Comp Size"},
    };
    for (const Case& c : kCases) {
        SCOPED_TRACE(c.name);
        TempFolder folder;
        fs::copy(fs::path(OSTREL_EXAMPLES_DIR) / "cards", folder.Path());
        fs::rename(folder.Path() / "cards.json", folder.Path() / "shots.json");
        std::string before = ReadAll(folder.Path() / "shots.json");
        std::string screen = OnTerminal(folder.Path(), "options shots.json", c.keys);
        EXPECT_NE(screen.find(std::string(c.printed) + "\r\nexit 0"), std::string::npos) << screen;
        std::string after = ReadAll(folder.Path() / "shots.json");
        // Only a change is written; the file is otherwise left byte for byte.
        EXPECT_EQ(after == before, std::string(c.printed).find("unchanged") != std::string::npos);
        std::string info = OnTerminal(folder.Path(), "info shots.json", {});
        EXPECT_NE(info.find(c.info), std::string::npos) << info;
    }
}

}  // namespace
}  // namespace ostrel
