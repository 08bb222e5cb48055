#include "instance_options.h"

#include <gtest/gtest.h>

#include <cstring>
#include <vector>

#include "plugin_test_support.h"

namespace {

using ormond_test::MemoryHost;
using ormond_test::SuiteServer;

constexpr int32_t kPluginId = 77;

class InstanceOptions : public ::testing::Test {
protected:
    InstanceOptions() {
        server.Serve(kQNGP_MemorySuite, 1, MemoryHost::Suite());
        in = {server.Basic(), kPluginId};
    }

    // Sets up from a flattened form (or none) and returns the choice of the new record.
    int32_t ChoiceAfterSetUp(QNGP_MemHandle flattened) {
        QNGP_MemHandle options = nullptr;
        EXPECT_EQ(ORM_InstanceSetUp(&in, nullptr, nullptr, nullptr, nullptr, flattened, &options),
                  0);
        ORM_InstanceOptions record;
        std::memcpy(&record, MemoryHost::Of(options).bytes.data(), sizeof record);
        EXPECT_EQ(record.majorVersion, 1);
        EXPECT_EQ(record.minorVersion, 0);
        return record.shadowMapSizeChoice;
    }

    SuiteServer server;
    MemoryHost memory;
    QNGP_InData in{};
};

TEST_F(InstanceOptions, SetUpWithoutFlattenedDataMakesSixteenNamedBytesChoosingCompSize) {
    QNGP_MemHandle options = nullptr;
    ASSERT_EQ(ORM_InstanceSetUp(&in, nullptr, nullptr, nullptr, nullptr, nullptr, &options), 0);
    const MemoryHost::Block& block = MemoryHost::Of(options);
    EXPECT_EQ(block.bytes.size(), 16u);
    EXPECT_EQ(block.name, "Tessary 3D options data");
    EXPECT_EQ(block.pluginId, kPluginId);
    EXPECT_EQ(block.flags, 1);
    EXPECT_EQ(block.locks, 0);
    ORM_InstanceOptions record;
    std::memcpy(&record, block.bytes.data(), sizeof record);
    EXPECT_EQ(record.shadowMapSizeChoice, 0);
    // Set-down frees it.
    EXPECT_EQ(ORM_InstanceSetDown(&in, nullptr, nullptr, nullptr, options), 0);
    EXPECT_EQ(memory.Live(), 0u);
    EXPECT_EQ(server.Held(), 0);
}

TEST_F(InstanceOptions, ChoiceFiveFlattensToTwelveBigEndianBytesAndSetsUpAgain) {
    QNGP_MemHandle options = memory.Make(std::vector<uint8_t>(16));
    const ORM_InstanceOptions live{1, 0, 5, 1};
    std::memcpy(MemoryHost::Of(options).bytes.data(), &live, sizeof live);

    QNGP_MemHandle flattened = nullptr;
    ASSERT_EQ(ORM_FlattenInstance(&in, nullptr, nullptr, nullptr, options, &flattened), 0);
    const std::vector<uint8_t> expected{0, 0, 0, 1, 0, 0, 0, 0, 0, 0, 0, 5};
    EXPECT_EQ(MemoryHost::Of(flattened).bytes, expected);
    EXPECT_EQ(MemoryHost::Of(flattened).name, "Tessary 3D options data");
    EXPECT_EQ(MemoryHost::Of(flattened).locks, 0);
    EXPECT_EQ(MemoryHost::Of(options).locks, 0);

    EXPECT_EQ(ChoiceAfterSetUp(flattened), 5);
    EXPECT_EQ(MemoryHost::Of(flattened).locks, 0);
    EXPECT_EQ(server.Held(), 0);
}

TEST_F(InstanceOptions, FlattenedFormOfAnotherVersionSetsUpWithChoiceZero) {
    struct Case {
        const char* name;
        std::vector<uint8_t> bytes;
        int32_t choice;
    };
    const Case kCases[] = {
        {"version 1.0", {0, 0, 0, 1, 0, 0, 0, 0, 0, 0, 0, 7}, 7},
        {"major version 2", {0, 0, 0, 2, 0, 0, 0, 0, 0, 0, 0, 7}, 0},
        {"minor version 1", {0, 0, 0, 1, 0, 0, 0, 1, 0, 0, 0, 7}, 0},
        {"little-endian 1.0", {1, 0, 0, 0, 0, 0, 0, 0, 7, 0, 0, 0}, 0},
        {"too short to be a flattened form", {0, 0, 0, 1, 0, 0, 0, 0}, 0},
    };
    for (const Case& c : kCases) {
        SCOPED_TRACE(c.name);
        EXPECT_EQ(ChoiceAfterSetUp(memory.Make(c.bytes)), c.choice);
    }
}

TEST_F(InstanceOptions, FlattenWithoutOptionsDoesNothing) {
    QNGP_MemHandle flattened = nullptr;
    EXPECT_EQ(ORM_FlattenInstance(&in, nullptr, nullptr, nullptr, nullptr, &flattened), 0);
    EXPECT_EQ(flattened, nullptr);
    EXPECT_EQ(memory.Live(), 0u);
}

TEST_F(InstanceOptions, MemoryFailureIsReturnedAndLeavesNoHandle) {
    memory.FailNextNew(0x55);
    QNGP_MemHandle options = nullptr;
    EXPECT_EQ(ORM_InstanceSetUp(&in, nullptr, nullptr, nullptr, nullptr, nullptr, &options), 0x55);
    EXPECT_EQ(options, nullptr);
    EXPECT_EQ(memory.Live(), 0u);
    EXPECT_EQ(server.Held(), 0);
}

}  // namespace
