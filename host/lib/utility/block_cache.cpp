#include "block_cache.h"

#include <cstdlib>
#include <map>
#include <mutex>
#include <new>
#include <vector>

#if defined(__linux__)
#include <sys/mman.h>
#include <unistd.h>
#endif

#if defined(__SANITIZE_ADDRESS__)
#include <sanitizer/asan_interface.h>
#define U_POISON(block, bytes) ASAN_POISON_MEMORY_REGION(block, bytes)
#define U_UNPOISON(block, bytes) ASAN_UNPOISON_MEMORY_REGION(block, bytes)
#else
#define U_POISON(block, bytes) ((void)(block), (void)(bytes))
#define U_UNPOISON(block, bytes) ((void)(block), (void)(bytes))
#endif

namespace u_memory {
namespace {

constexpr size_t kHugePage = 2 * 1024 * 1024;

// Kept blocks may hold an eighth of the machine's memory.
size_t KeptBytesLimit() {
#if defined(__linux__)
    long pages = sysconf(_SC_PHYS_PAGES), pageBytes = sysconf(_SC_PAGESIZE);
    if (pages > 0 && pageBytes > 0) return static_cast<size_t>(pages) * pageBytes / 8;
#endif
    return size_t{1} << 30;
}

struct KeptBlocks {
    std::mutex lock;
    std::map<size_t, std::vector<void*>> bySize;
    size_t bytes = 0;
    const size_t limit = KeptBytesLimit();
};

// Never destroyed: blocks may be freed by static destructors that run after this one would.
KeptBlocks& Kept() {
    static auto* kept = new KeptBlocks;
    return *kept;
}

void* AllocateRaw(size_t bytes) {
    if (bytes < kHugePage) return std::malloc(bytes);
    size_t rounded = (bytes + kHugePage - 1) / kHugePage * kHugePage;
    void* block = std::aligned_alloc(kHugePage, rounded);
#if defined(__linux__) && defined(MADV_HUGEPAGE)
    if (block) madvise(block, rounded, MADV_HUGEPAGE);
#endif
    return block;
}

void* TakeKept(size_t bytes) {
    KeptBlocks& kept = Kept();
    std::lock_guard<std::mutex> hold(kept.lock);
    auto found = kept.bySize.find(bytes);
    if (found == kept.bySize.end() || found->second.empty()) return nullptr;
    void* block = found->second.back();
    found->second.pop_back();
    kept.bytes -= bytes;
    U_UNPOISON(block, bytes);
    return block;
}

}  // namespace

void* TakeRawBlock(size_t bytes) {
    if (bytes >= kKeptBlockMinimum) {
        if (void* block = TakeKept(bytes)) return block;
    }
    void* block = AllocateRaw(bytes);
    if (!block && LetKeptBlocksGo()) block = AllocateRaw(bytes);
    return block;
}

void GiveBackRawBlock(void* block, size_t bytes) noexcept {
    if (bytes >= kKeptBlockMinimum) {
        KeptBlocks& kept = Kept();
        std::lock_guard<std::mutex> hold(kept.lock);
        if (kept.bytes + bytes <= kept.limit) {
            // Keeping a block takes a little memory of its own; when even that is gone, the
            // block is freed instead, since destructors give blocks back and must not throw.
            try {
                kept.bySize[bytes].push_back(block);
            } catch (const std::bad_alloc&) {
                std::free(block);
                return;
            }
            kept.bytes += bytes;
            U_POISON(block, bytes);
            return;
        }
    }
    std::free(block);
}

bool LetKeptBlocksGo() {
    KeptBlocks& kept = Kept();
    std::map<size_t, std::vector<void*>> blocks;
    {
        std::lock_guard<std::mutex> hold(kept.lock);
        blocks.swap(kept.bySize);
        kept.bytes = 0;
    }
    bool any = false;
    for (auto& [bytes, list] : blocks) {
        for (void* block : list) {
            U_UNPOISON(block, bytes);
            std::free(block);
            any = true;
        }
    }
    return any;
}

}  // namespace u_memory
