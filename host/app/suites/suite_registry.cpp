#include "suites/suite_registry.h"

namespace ostrel {

SuiteRegistry& SuiteRegistry::Instance() {
    static SuiteRegistry registry;
    return registry;
}

const QNGP_BasicSuite* SuiteRegistry::BasicSuite() {
    static const QNGP_BasicSuite suite{&Acquire, &Release};
    return &suite;
}

void SuiteRegistry::Add(const std::string& name, int32_t version, const void* table) {
    std::lock_guard lock(mutex_);
    entries_[{name, version}] = Entry{table, 0};
}

void SuiteRegistry::Remove(const std::string& name, int32_t version) {
    std::lock_guard lock(mutex_);
    entries_.erase({name, version});
}

int64_t SuiteRegistry::Outstanding() const {
    std::lock_guard lock(mutex_);
    int64_t total = 0;
    for (const auto& [key, entry] : entries_)
        total += entry.outstanding;
    return total;
}

int32_t SuiteRegistry::Acquire(const char* name, int32_t version, const void** suite) {
    if (!suite) return kQNGP_ErrMissingSuite;
    *suite = nullptr;
    if (!name) return kQNGP_ErrMissingSuite;
    SuiteRegistry& registry = Instance();
    std::lock_guard lock(registry.mutex_);
    auto it = registry.entries_.find({name, version});
    if (it == registry.entries_.end()) return kQNGP_ErrMissingSuite;
    ++it->second.outstanding;
    *suite = it->second.table;
    return 0;
}

int32_t SuiteRegistry::Release(const char* name, int32_t version) {
    if (!name) return kQNGP_ErrMissingSuite;
    SuiteRegistry& registry = Instance();
    std::lock_guard lock(registry.mutex_);
    auto it = registry.entries_.find({name, version});
    if (it == registry.entries_.end() || it->second.outstanding == 0) return kQNGP_ErrMissingSuite;
    --it->second.outstanding;
    return 0;
}

}  // namespace ostrel
