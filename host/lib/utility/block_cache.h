// Large blocks kept between frames. A frame asks for the same large blocks as the one before
// it (output worlds, fragment tables and pools); handing back the blocks the last frame freed
// keeps their pages mapped and warm instead of returning them to the system and faulting them
// in again, page by page, on first touch.
#pragma once

#include <cstddef>

namespace u_memory {

// Blocks of at least this many bytes (header included) are kept for reuse.
inline constexpr size_t kKeptBlockMinimum = 64 * 1024;

// A raw block of exactly bytes, from the kept ones or newly allocated; null when the memory is
// not there even after letting every kept block go. Blocks of 2 MiB and more are aligned so
// that the system can back them with huge pages.
void* TakeRawBlock(size_t bytes);

// Keeps the raw block of bytes for a later TakeRawBlock of the same size, or frees it when
// the kept blocks already hold their share of the machine's memory.
void GiveBackRawBlock(void* block, size_t bytes) noexcept;

// Frees every kept block. Returns true when there were any.
bool LetKeptBlocksGo();

}  // namespace u_memory
