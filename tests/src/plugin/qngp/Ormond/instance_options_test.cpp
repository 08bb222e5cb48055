#include "instance_options.h"

#include <gtest/gtest.h>

#include <cstring>
#include <vector>

#include "plugin_test_support.h"

namespace {

using ormond_test::FakeHost;

class InstanceOptions : public ::testing::Test {
protected:
    InstanceOptions() { in = {host.Basic(), 77}; }

    // Sets up from a flattened form (or none); the new record's choice is its third word.
    QNGP_MemHandle SetUp(QNGP_MemHandle flattened, int32_t* choice) {
        QNGP_MemHandle options = nullptr;
        EXPECT_EQ(ORM_InstanceSetUp(&in, nullptr, nullptr, nullptr, nullptr, flattened, &options),
                  0);
        ORM_InstanceOptions record;
        std::memcpy(&record, FakeHost::Of(options).bytes.data(), sizeof record);
        EXPECT_EQ(std::vector<int32_t>({record.majorVersion, record.minorVersion}),
                  std::vector<int32_t>({1, 0}));
        *choice = record.shadowMapSizeChoice;
        return options;
    }

    FakeHost host;
    QNGP_InData in{};
};

TEST_F(InstanceOptions, SetUpFlattenAndSetUpAgainKeepTheChoice) {
    int32_t choice = -1;
    QNGP_MemHandle options = SetUp(nullptr, &choice);
    EXPECT_EQ(choice, 0);
    EXPECT_EQ(FakeHost::Of(options).bytes.size(), 16u);

    const ORM_InstanceOptions live{1, 0, 5, 1};
    std::memcpy(FakeHost::Of(options).bytes.data(), &live, sizeof live);
    QNGP_MemHandle flattened = nullptr;
    ASSERT_EQ(ORM_FlattenInstance(&in, nullptr, nullptr, nullptr, options, &flattened), 0);
    const std::vector<uint8_t> expected{0, 0, 0, 1, 0, 0, 0, 0, 0, 0, 0, 5};
    EXPECT_EQ(FakeHost::Of(flattened).bytes, expected);
    EXPECT_EQ(ORM_InstanceSetDown(&in, nullptr, nullptr, nullptr, SetUp(flattened, &choice)), 0);
    EXPECT_EQ(choice, 5);
    EXPECT_EQ(ORM_InstanceSetDown(&in, nullptr, nullptr, nullptr, options), 0);

    // Without options there is nothing to flatten.
    QNGP_MemHandle none = nullptr;
    EXPECT_EQ(ORM_FlattenInstance(&in, nullptr, nullptr, nullptr, nullptr, &none), 0);
    EXPECT_EQ(none, nullptr);
    EXPECT_EQ(host.Live(), 1u);  // the flattened form, the host's to free
    EXPECT_EQ(FakeHost::Of(flattened).locks, 0);
    EXPECT_EQ(host.Held(), 0);
}

TEST_F(InstanceOptions, FlattenedFormOfAnotherVersionSetsUpWithChoiceZero) {
    // Major version 2, minor version 1, 1.0 little-endian, too short to be a flattened form.
    const std::vector<uint8_t> kForms[] = {
        {0, 0, 0, 2, 0, 0, 0, 0, 0, 0, 0, 7},
        {0, 0, 0, 1, 0, 0, 0, 1, 0, 0, 0, 7},
        {1, 0, 0, 0, 0, 0, 0, 0, 7, 0, 0, 0},
        {0, 0, 0, 1, 0, 0, 0, 0},
    };
    for (const std::vector<uint8_t>& form : kForms) {
        int32_t choice = -1;
        SetUp(host.Make(form), &choice);
        EXPECT_EQ(choice, 0) << testing::PrintToString(form);
    }
}

TEST_F(InstanceOptions, MemoryFailureIsReturnedAndLeavesNoHandle) {
    host.FailNextNew(0x55);
    QNGP_MemHandle options = nullptr;
    EXPECT_EQ(ORM_InstanceSetUp(&in, nullptr, nullptr, nullptr, nullptr, nullptr, &options), 0x55);
    EXPECT_EQ(options, nullptr);
    EXPECT_EQ(host.Live(), 0u);
    EXPECT_EQ(host.Held(), 0);
}

}  // namespace
