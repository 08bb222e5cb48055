#include "composition/library_console.h"

#include <sys/mman.h>
#include <unistd.h>

#include <cstdio>
#include <mutex>
#include <sstream>
#include <string>

namespace ostrel {
namespace {

std::mutex& ConsoleMutex() {
    static std::mutex mutex;
    return mutex;
}

std::string ReadAll(int fd) {
    std::string text;
    char chunk[4096];
    lseek(fd, 0, SEEK_SET);
    for (ssize_t n; (n = read(fd, chunk, sizeof chunk)) > 0;)
        text.append(chunk, static_cast<size_t>(n));
    return text;
}

void WriteAll(int fd, const std::string& text) {
    for (size_t done = 0; done < text.size();) {
        ssize_t n = write(fd, text.data() + done, text.size() - done);
        if (n <= 0) return;
        done += static_cast<size_t>(n);
    }
}

}  // namespace

LibraryConsole::LibraryConsole() {
    ConsoleMutex().lock();
    std::fflush(stderr);
    buffer_ = memfd_create("ostrel-library-console", MFD_CLOEXEC);
    saved_ = buffer_ < 0 ? -1 : dup(STDERR_FILENO);
    if (saved_ < 0 || dup2(buffer_, STDERR_FILENO) < 0) {
        // Without a buffer the library's lines reach the terminal, which is untidy but harmless.
        if (buffer_ >= 0) close(buffer_);
        if (saved_ >= 0) close(saved_);
        buffer_ = saved_ = -1;
    }
}

LibraryConsole::~LibraryConsole() {
    if (buffer_ >= 0) {
        std::fflush(stderr);
        dup2(saved_, STDERR_FILENO);
        close(saved_);
        std::istringstream lines(ReadAll(buffer_));
        close(buffer_);
        std::string kept;
        for (std::string line; std::getline(lines, line);) {
            if (line.rfind("libpng ", 0) == 0) continue;
            kept += line;
            kept += '\n';
        }
        WriteAll(STDERR_FILENO, kept);
    }
    ConsoleMutex().unlock();
}

}  // namespace ostrel
