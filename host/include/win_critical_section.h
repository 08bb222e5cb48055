// The Windows critical-section calls, with a POSIX stand-in elsewhere.
#pragma once

#ifdef _WIN32
#include <windows.h>
#else
#include <pthread.h>

#include <cstdint>

// A lock that spins a little before it sleeps.
struct CRITICAL_SECTION {
    pthread_mutex_t mutex;
    uint32_t spinCount;
};

// Returns non-zero on success. The spin count is how often a waiter tries before it sleeps.
inline int InitializeCriticalSectionAndSpinCount(CRITICAL_SECTION* section, uint32_t spinCount) {
    section->spinCount = spinCount;
    return pthread_mutex_init(&section->mutex, nullptr) == 0;
}

// Waits for the lock; spinCount tries before it blocks.
inline void EnterCriticalSection(CRITICAL_SECTION* section) {
    for (uint32_t i = 0; i < section->spinCount; ++i) {
        if (pthread_mutex_trylock(&section->mutex) == 0) return;
    }
    pthread_mutex_lock(&section->mutex);
}

// Releases the lock that this thread holds.
inline void LeaveCriticalSection(CRITICAL_SECTION* section) {
    pthread_mutex_unlock(&section->mutex);
}

// Frees the lock; nobody may hold it.
inline void DeleteCriticalSection(CRITICAL_SECTION* section) {
    pthread_mutex_destroy(&section->mutex);
}
#endif
