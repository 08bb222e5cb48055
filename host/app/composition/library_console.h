// Keeps what an image library prints straight to the standard error out of the user's
// terminal: the PNG library writes its own line for every error before the reader reports the
// same words, and a user should see one line per problem.
#pragma once

namespace ostrel {

// While alive, writes to the standard error go to a buffer; on destruction the buffer goes back
// to the standard error, less the PNG library's own lines. Nothing another thread writes in the
// meantime is lost, only delayed. One at a time in the process.
class LibraryConsole {
public:
    LibraryConsole();
    ~LibraryConsole();
    LibraryConsole(const LibraryConsole&) = delete;
    LibraryConsole& operator=(const LibraryConsole&) = delete;

private:
    int saved_ = -1;
    int buffer_ = -1;
};

}  // namespace ostrel
