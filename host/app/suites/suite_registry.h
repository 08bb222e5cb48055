// The host's basic suite: every other suite is served by name and version from here.
#pragma once

#include <cstdint>
#include <map>
#include <mutex>
#include <string>
#include <utility>

#include "qngp_suites.h"

namespace ostrel {

class SuiteRegistry {
public:
    // The process's registry, behind the basic suite that plug-ins receive.
    static SuiteRegistry& Instance();
    static const QNGP_BasicSuite* BasicSuite();

    // Serves `table` under (name, version) from now on; a later call replaces it.
    void Add(const std::string& name, int32_t version, const void* table);
    void Remove(const std::string& name, int32_t version);

    // Suites acquired and not yet released, over all names; a balanced plug-in leaves it at 0.
    int64_t Outstanding() const;

private:
    static int32_t Acquire(const char* name, int32_t version, const void** suite);
    static int32_t Release(const char* name, int32_t version);

    using Key = std::pair<std::string, int32_t>;
    struct Entry {
        const void* table;
        int64_t outstanding;
    };
    mutable std::mutex mutex_;
    std::map<Key, Entry> entries_;
};

// Registers a suite table for as long as the object lives.
class ScopedSuite {
public:
    ScopedSuite(std::string name, int32_t version, const void* table)
        : name_(std::move(name)), version_(version) {
        SuiteRegistry::Instance().Add(name_, version_, table);
    }
    ~ScopedSuite() { SuiteRegistry::Instance().Remove(name_, version_); }
    ScopedSuite(const ScopedSuite&) = delete;
    ScopedSuite& operator=(const ScopedSuite&) = delete;

private:
    std::string name_;
    int32_t version_;
};

}  // namespace ostrel
