// Arrays owned by the scene model and the frame driver: taken through the host's purge loop,
// accounted while held, and freed on every way out.
#pragma once

#include <cstddef>
#include <cstdint>
#include <new>
#include <type_traits>
#include <utility>

#include "u_memory.h"

// Holds count elements of T in memory that the host's allocator hands out; the elements are
// value-initialised on allocation and destroyed on reset.
template <class T>
class SY_OwnedArray {
    static_assert(std::is_nothrow_default_constructible_v<T>, "records construct without failing");

public:
    SY_OwnedArray() = default;
    ~SY_OwnedArray() { Reset(); }
    SY_OwnedArray(const SY_OwnedArray&) = delete;
    SY_OwnedArray& operator=(const SY_OwnedArray&) = delete;
    SY_OwnedArray(SY_OwnedArray&& other) noexcept
        : data_(std::exchange(other.data_, nullptr)), count_(std::exchange(other.count_, 0)) {}
    SY_OwnedArray& operator=(SY_OwnedArray&& other) noexcept {
        if (this != &other) {
            Reset();
            data_ = std::exchange(other.data_, nullptr);
            count_ = std::exchange(other.count_, 0);
        }
        return *this;
    }

    // Replaces the contents by count value-initialised elements. Throws the host's error code
    // when the memory cannot be had; the array is then empty.
    void Allocate(int32_t count) {
        Reset();
        if (count <= 0) return;
        U_PurgeRecord record;
        record.count = count;
        size_t bytes = sizeof(T) * static_cast<size_t>(count);
        if (int32_t error = U_PurgeLoop(bytes, &Construct, &record, 0)) throw error;
        if (record.error) throw record.error;
        U_AccountAllocationEx(bytes, 1);
        data_ = static_cast<T*>(record.array);
        count_ = count;
    }

    void Reset() {
        if (!data_) return;
        if constexpr (!std::is_trivially_destructible_v<T>) {
            for (int32_t i = 0; i < count_; ++i)
                data_[i].~T();
        }
        U_AccountAllocationEx(sizeof(T) * static_cast<size_t>(count_), 0);
        U_FreePtr(data_);
        data_ = nullptr;
        count_ = 0;
    }

    int32_t Count() const { return count_; }
    bool Empty() const { return count_ == 0; }
    T* Data() { return data_; }
    const T* Data() const { return data_; }
    T& operator[](int32_t i) { return data_[i]; }
    const T& operator[](int32_t i) const { return data_[i]; }
    T* begin() { return data_; }
    T* end() { return data_ + count_; }
    const T* begin() const { return data_; }
    const T* end() const { return data_ + count_; }

private:
    static void Construct(void* element) { new (element) T(); }

    T* data_ = nullptr;
    int32_t count_ = 0;
};
