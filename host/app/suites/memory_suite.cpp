#include "suites/memory_suite.h"

#include <atomic>
#include <string>
#include <vector>

struct QNGP_Memory {
    std::string name;
    std::vector<uint8_t> bytes;
    int32_t locks = 0;
};

namespace ostrel {
namespace {

std::atomic<int64_t> gLive{0};
std::atomic<int64_t> gLocked{0};

int32_t NewHandle(int32_t, const char* name, uint32_t size, int32_t, QNGP_MemHandle* handle) {
    if (!handle) return kQNGP_ErrBadHandle;
    *handle = new QNGP_Memory{name ? name : "", std::vector<uint8_t>(size), 0};
    ++gLive;
    return 0;
}

int32_t FreeHandle(QNGP_MemHandle handle) {
    if (!handle) return kQNGP_ErrBadHandle;
    if (handle->locks) gLocked -= 1;
    delete handle;
    --gLive;
    return 0;
}

int32_t LockHandle(QNGP_MemHandle handle, void** pointer) {
    if (!handle || !pointer) return kQNGP_ErrBadHandle;
    if (handle->locks++ == 0) ++gLocked;
    *pointer = handle->bytes.data();
    return 0;
}

int32_t UnlockHandle(QNGP_MemHandle handle) {
    if (!handle || handle->locks == 0) return kQNGP_ErrBadHandle;
    if (--handle->locks == 0) --gLocked;
    return 0;
}

int32_t GetHandleSize(QNGP_MemHandle handle, uint32_t* size) {
    if (!handle || !size) return kQNGP_ErrBadHandle;
    *size = static_cast<uint32_t>(handle->bytes.size());
    return 0;
}

}  // namespace

const QNGP_MemorySuite1* MemorySuite() {
    static const QNGP_MemorySuite1 suite{&NewHandle, &FreeHandle, &LockHandle, &UnlockHandle,
                                         &GetHandleSize};
    return &suite;
}

int64_t LiveMemoryHandles() {
    return gLive.load();
}
int64_t LockedMemoryHandles() {
    return gLocked.load();
}

}  // namespace ostrel
