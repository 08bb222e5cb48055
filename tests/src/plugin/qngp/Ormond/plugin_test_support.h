// A host for driving single entry points: a basic suite serving the suites a test hands it and
// a Memory suite of plain byte blocks, and a log of what the user was told. Whole frames run
// through the stand-in host.
#pragma once

#include <cstdint>
#include <cstdio>
#include <map>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "qngp_suites.h"
#include "u_report.h"

namespace ormond_test {

// One lives at a time; the suites it serves reach it through current().
class FakeHost {
public:
    struct Block {
        std::vector<uint8_t> bytes;
        int32_t locks = 0;
    };

    FakeHost() : previousReporter_(U_SetReporter(&Collect)) {
        current() = this;
        Serve(kQNGP_MemorySuite, 1, &kMemory);
    }
    ~FakeHost() {
        U_SetReporter(previousReporter_);
        current() = nullptr;
    }
    FakeHost(const FakeHost&) = delete;
    FakeHost& operator=(const FakeHost&) = delete;

    void Serve(const char* name, int32_t version, const void* suite) {
        suites_[{name, version}] = suite;
    }
    // The answer to a suite it does not serve; 0 answers success with a null suite.
    void SetMissingError(int32_t error) { missingError_ = error; }
    const QNGP_BasicSuite* Basic() const { return &kBasic; }
    // Suites acquired and not yet released; a release of a suite it does not serve is ignored.
    int32_t Held() const { return held_; }

    QNGP_MemHandle Make(std::vector<uint8_t> bytes) {
        auto block = std::make_unique<Block>(Block{std::move(bytes)});
        auto handle = reinterpret_cast<QNGP_MemHandle>(block.get());
        blocks_[handle] = std::move(block);
        return handle;
    }
    static Block& Of(QNGP_MemHandle handle) { return *current()->blocks_.at(handle); }
    size_t Live() const { return blocks_.size(); }
    // The next NewHandle answers with this error.
    void FailNextNew(int32_t error) { failNew_ = error; }

    // Each report as "text (code, severity)".
    const std::vector<std::string>& Reports() const { return reports_; }

private:
    static FakeHost*& current() {
        static FakeHost* host = nullptr;
        return host;
    }
    static int32_t Acquire(const char* name, int32_t version, const void** suite) {
        FakeHost& self = *current();
        auto found = self.suites_.find({name, version});
        *suite = found == self.suites_.end() ? nullptr : found->second;
        if (!*suite) return self.missingError_;
        ++self.held_;
        return 0;
    }
    static int32_t Release(const char* name, int32_t version) {
        current()->held_ -= current()->suites_.count({name, version}) ? 1 : 0;
        return 0;
    }
    static int32_t NewHandle(int32_t, const char*, uint32_t size, int32_t, QNGP_MemHandle* handle) {
        if (int32_t error = std::exchange(current()->failNew_, 0)) return error;
        *handle = current()->Make(std::vector<uint8_t>(size, 0xEE));
        return 0;
    }
    static int32_t FreeHandle(QNGP_MemHandle handle) {
        return current()->blocks_.erase(handle) ? 0 : 1;
    }
    static int32_t LockHandle(QNGP_MemHandle handle, void** pointer) {
        ++Of(handle).locks;
        *pointer = Of(handle).bytes.data();
        return 0;
    }
    static int32_t UnlockHandle(QNGP_MemHandle handle) {
        --Of(handle).locks;
        return 0;
    }
    static int32_t GetHandleSize(QNGP_MemHandle handle, uint32_t* size) {
        *size = static_cast<uint32_t>(Of(handle).bytes.size());
        return 0;
    }
    static void Collect(const U_Report& report) {
        char tail[32];
        std::snprintf(tail, sizeof tail, " (%#x, %d)", static_cast<unsigned>(report.code),
                      report.severity);
        current()->reports_.push_back(std::string(report.text) + tail);
    }

    static constexpr QNGP_BasicSuite kBasic{&Acquire, &Release};
    static constexpr QNGP_MemorySuite1 kMemory{&NewHandle, &FreeHandle, &LockHandle, &UnlockHandle,
                                               &GetHandleSize};
    U_Reporter previousReporter_;
    std::map<std::pair<std::string, int32_t>, const void*> suites_;
    int32_t missingError_ = kQNGP_ErrMissingSuite;
    int32_t held_ = 0;
    std::map<QNGP_MemHandle, std::unique_ptr<Block>> blocks_;
    int32_t failNew_ = 0;
    std::vector<std::string> reports_;
};

}  // namespace ormond_test
