// Writing frames while the next one renders.
#pragma once

#include <future>

#include "output/image_writer.h"

namespace ostrel {

// Writes prepared frames on a thread of its own, one at a time. The failure of a write comes
// back from the next Write or from Finish; a writer that goes away waits for the write in
// flight, so no frame is left half written.
class FrameWriter {
public:
    // Waits while the previous frame is still being written, then starts writing this one.
    // Throws the previous write's failure.
    void Write(PreparedImage image);

    // Waits for the last write. Throws its failure.
    void Finish();

private:
    std::future<void> pending_;
};

}  // namespace ostrel
