#include "output/frame_writer.h"

#include <utility>

namespace ostrel {

void FrameWriter::Write(PreparedImage image) {
    Finish();
    pending_ = std::async(std::launch::async, [frame = std::move(image)] { WritePrepared(frame); });
}

void FrameWriter::Finish() {
    if (pending_.valid()) pending_.get();
}

}  // namespace ostrel
