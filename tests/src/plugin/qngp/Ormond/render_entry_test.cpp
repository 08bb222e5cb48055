#include "render_entry.h"

#include <gtest/gtest.h>

#include <optional>
#include <string>
#include <vector>

#include "instance_options.h"
#include "plugin_test_support.h"

namespace {

using ormond_test::FakeHost;

// "QNGP Persistent Data Suite" 3 holding at most the one setting; a missing key answers the
// caller's default.
std::optional<int32_t> gMultiprocessing;

constexpr QNGP_PersistentDataSuite3 kPersistentData{
    [](QNGP_PersistentBlobH* blob) {
        *blob = nullptr;
        return int32_t{0};
    },
    [](QNGP_PersistentBlobH, const char* section, const char* key, int32_t defaultValue,
       int32_t* value) {
        bool stored = std::string(section) + "/" + key == "Tessary 3D/Enable Multiprocessing";
        *value = stored ? gMultiprocessing.value_or(defaultValue) : defaultValue;
        return int32_t{0};
    },
};

TEST(RenderEntry, MultiprocessingSettingIsOnUnlessTheUserTurnedItOff) {
    struct Case {
        std::optional<int32_t> stored;
        bool enabled;
    };
    const Case kCases[] = {{std::nullopt, true}, {0, false}, {1, true}, {2, true}};
    for (const Case& c : kCases) {
        SCOPED_TRACE(c.stored ? std::to_string(*c.stored) : "missing");
        gMultiprocessing = c.stored;
        FakeHost host;
        host.Serve(kQNGP_PersistentDataSuite, 3, &kPersistentData);
        {
            ORM_SuiteTable suites(host.Basic());
            EXPECT_EQ(ORM_MultiprocessingSetting(suites), c.enabled);
        }
        EXPECT_EQ(host.Held(), 0);
    }
}

TEST(RenderEntry, MissingSuiteEndsTheFrameWithThirteenBeforeAnythingIsTaken) {
    FakeHost host;
    host.Serve(kQNGP_PersistentDataSuite, 3, &kPersistentData);
    QNGP_MemHandle options = host.Make(std::vector<uint8_t>(sizeof(ORM_InstanceOptions)));
    const QNGP_InData in{host.Basic(), 9};
    EXPECT_EQ(ORM_Render(&in, nullptr, nullptr, nullptr, nullptr, options, nullptr), 13);
    EXPECT_EQ(host.Reports(),
              std::vector<std::string>{"Ostrel 3D: Could not acquire TOMA suite. (0x13a80002, 8)"});
    EXPECT_EQ(FakeHost::Of(options).locks, 0);
    EXPECT_EQ(host.Held(), 0);
}

}  // namespace
