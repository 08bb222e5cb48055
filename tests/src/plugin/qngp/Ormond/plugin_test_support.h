// A basic suite that serves only the suites a test hands it, a Memory suite of plain byte
// blocks, and a log of what the host was told. Enough to drive single entry points; whole
// frames run through the stand-in host.
#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "qngp_suites.h"
#include "u_report.h"

namespace ormond_test {

// Serves suites by name and version while it lives; one at a time.
class SuiteServer {
public:
    SuiteServer() { current() = this; }
    ~SuiteServer() { current() = nullptr; }
    SuiteServer(const SuiteServer&) = delete;
    SuiteServer& operator=(const SuiteServer&) = delete;

    void Serve(const char* name, int32_t version, const void* suite) {
        suites_[{name, version}] = suite;
    }
    // The error the host answers an acquisition of a suite it does not serve with; 0 makes it
    // answer success with a null suite.
    void SetMissingError(int32_t error) { missingError_ = error; }

    const QNGP_BasicSuite* Basic() const { return &kBasic; }
    // Suites acquired and not yet released.
    int32_t Held() const { return held_; }
    const std::vector<std::pair<std::string, int32_t>>& Acquired() const { return acquired_; }
    const std::vector<std::pair<std::string, int32_t>>& Released() const { return released_; }

private:
    static SuiteServer*& current() {
        static SuiteServer* server = nullptr;
        return server;
    }
    static int32_t Acquire(const char* name, int32_t version, const void** suite) {
        SuiteServer& self = *current();
        auto found = self.suites_.find({name, version});
        if (found == self.suites_.end()) {
            *suite = nullptr;
            return self.missingError_;
        }
        *suite = found->second;
        ++self.held_;
        self.acquired_.emplace_back(name, version);
        return 0;
    }
    static int32_t Release(const char* name, int32_t version) {
        SuiteServer& self = *current();
        --self.held_;
        self.released_.emplace_back(name, version);
        return 0;
    }

    static constexpr QNGP_BasicSuite kBasic{&Acquire, &Release};
    std::map<std::pair<std::string, int32_t>, const void*> suites_;
    int32_t missingError_ = kQNGP_ErrMissingSuite;
    int32_t held_ = 0;
    std::vector<std::pair<std::string, int32_t>> acquired_;
    std::vector<std::pair<std::string, int32_t>> released_;
};

// "QNGP Memory Suite" 1 over byte blocks; counts locks so that a test sees every lock undone.
class MemoryHost {
public:
    struct Block {
        std::string name;
        int32_t pluginId;
        int32_t flags;
        std::vector<uint8_t> bytes;
        int32_t locks = 0;
    };

    MemoryHost() { current() = this; }
    ~MemoryHost() { current() = nullptr; }
    MemoryHost(const MemoryHost&) = delete;
    MemoryHost& operator=(const MemoryHost&) = delete;

    static const QNGP_MemorySuite1* Suite() { return &kSuite; }

    QNGP_MemHandle Make(std::vector<uint8_t> bytes) {
        auto block = std::make_unique<Block>(Block{"test", 0, 0, std::move(bytes)});
        auto handle = reinterpret_cast<QNGP_MemHandle>(block.get());
        blocks_[handle] = std::move(block);
        return handle;
    }
    static Block& Of(QNGP_MemHandle handle) { return *current()->blocks_.at(handle); }
    size_t Live() const { return blocks_.size(); }
    // The next NewHandle answers with this error.
    void FailNextNew(int32_t error) { failNew_ = error; }

private:
    static MemoryHost*& current() {
        static MemoryHost* host = nullptr;
        return host;
    }
    static int32_t NewHandle(int32_t pluginId, const char* name, uint32_t size, int32_t flags,
                             QNGP_MemHandle* handle) {
        MemoryHost& self = *current();
        if (int32_t error = std::exchange(self.failNew_, 0)) return error;
        *handle = self.Make(std::vector<uint8_t>(size, 0xEE));
        Block& block = Of(*handle);
        block.name = name;
        block.pluginId = pluginId;
        block.flags = flags;
        return 0;
    }
    static int32_t FreeHandle(QNGP_MemHandle handle) {
        return current()->blocks_.erase(handle) ? 0 : 1;
    }
    static int32_t LockHandle(QNGP_MemHandle handle, void** pointer) {
        Block& block = Of(handle);
        ++block.locks;
        *pointer = block.bytes.data();
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

    static constexpr QNGP_MemorySuite1 kSuite{&NewHandle, &FreeHandle, &LockHandle, &UnlockHandle,
                                              &GetHandleSize};
    std::map<QNGP_MemHandle, std::unique_ptr<Block>> blocks_;
    int32_t failNew_ = 0;
};

// Everything reported to the user while it lives.
class ReportLog {
public:
    struct Entry {
        U_Report::Kind kind;
        int32_t code;
        int32_t severity;
        std::string text;
    };

    ReportLog() : previous_(U_SetReporter(&Collect)) { entries().clear(); }
    ~ReportLog() { U_SetReporter(previous_); }
    ReportLog(const ReportLog&) = delete;
    ReportLog& operator=(const ReportLog&) = delete;

    static std::vector<Entry>& entries() {
        static std::vector<Entry> log;
        return log;
    }

private:
    static void Collect(const U_Report& report) {
        entries().push_back({report.kind, report.code, report.severity, report.text});
    }
    U_Reporter previous_;
};

}  // namespace ormond_test
