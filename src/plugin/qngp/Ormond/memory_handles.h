// Host memory handles held for the length of a call: a new handle that goes back to the host
// only when the call succeeds, and a lock that is undone on every way out.
#pragma once

#include <cstdint>
#include <utility>

#include "qngp_suites.h"
#include "suite_table.h"

class ORM_LockedHandle {
public:
    ORM_LockedHandle(const QNGP_MemorySuite1& memory, QNGP_MemHandle handle)
        : memory_(memory), handle_(handle) {
        ORM_Check(memory_.LockHandle(handle_, &pointer_));
    }
    // A failure to unlock is thrown when Unlock is called, ignored when an unwinding call leaves.
    ~ORM_LockedHandle() {
        if (pointer_) memory_.UnlockHandle(handle_);
    }
    ORM_LockedHandle(const ORM_LockedHandle&) = delete;
    ORM_LockedHandle& operator=(const ORM_LockedHandle&) = delete;

    template <class T>
    T* As() const {
        return static_cast<T*>(pointer_);
    }

    void Unlock() {
        pointer_ = nullptr;
        ORM_Check(memory_.UnlockHandle(handle_));
    }

private:
    const QNGP_MemorySuite1& memory_;
    QNGP_MemHandle handle_;
    void* pointer_ = nullptr;
};

class ORM_NewHandle {
public:
    ORM_NewHandle(const QNGP_MemorySuite1& memory, int32_t pluginId, const char* name,
                  uint32_t size)
        : memory_(memory) {
        ORM_Check(memory_.NewHandle(pluginId, name, size, 1, &handle_));
    }
    ~ORM_NewHandle() {
        if (handle_) memory_.FreeHandle(handle_);
    }
    ORM_NewHandle(const ORM_NewHandle&) = delete;
    ORM_NewHandle& operator=(const ORM_NewHandle&) = delete;

    QNGP_MemHandle Get() const { return handle_; }
    // Hands the handle over; this object no longer frees it.
    QNGP_MemHandle Release() { return std::exchange(handle_, nullptr); }

private:
    const QNGP_MemorySuite1& memory_;
    QNGP_MemHandle handle_ = nullptr;
};
