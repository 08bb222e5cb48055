// The plug-in's entry points as the host calls them: registration, the about box and a frame,
// and what each does when the host cannot give it a suite.
#include <gtest/gtest.h>

#include <new>
#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

#include "about_box.h"
#include "entry_guard.h"
#include "instance_options.h"
#include "plugin_test_support.h"
#include "registration.h"
#include "render_entry.h"
#include "suite_table.h"

namespace {

using ormond_test::FakeHost;

// What the user is told when a suite cannot be acquired.
const std::string kMissingSuite = "Ostrel 3D: Could not acquire TOMA suite. (0x13a80002, 8)";

TEST(SuiteTable, SuiteThatCannotBeAcquiredIsReportedAndThrowsThirteen) {
    struct Case {
        const char* name;
        bool nullBasic;
        int32_t missingError;
    };
    const Case kCases[] = {
        {"host answers an error", false, kQNGP_ErrMissingSuite},
        {"host answers success with no suite", false, 0},
        {"no basic suite", true, 0},
    };
    for (const Case& c : kCases) {
        SCOPED_TRACE(c.name);
        FakeHost host;
        host.SetMissingError(c.missingError);
        EXPECT_EQ(ORM_Guard([&] {
                      ORM_SuiteTable suites(c.nullBasic ? nullptr : host.Basic());
                      suites.Get<QNGP_LayerSuite10>();
                  }),
                  13);
        EXPECT_EQ(host.Reports(), std::vector{kMissingSuite});
        EXPECT_EQ(host.Held(), 0);
    }
}

TEST(EntryGuard, TurnsWhatIsThrownIntoTheResult) {
    FakeHost host;
    EXPECT_EQ(ORM_Guard([] {}), 0);
    EXPECT_EQ(ORM_Guard([] { throw int32_t{0x1234}; }), 0x1234);
    EXPECT_TRUE(host.Reports().empty());

    EXPECT_EQ(ORM_Guard([] { throw std::bad_alloc(); }), 4);
    EXPECT_EQ(ORM_Guard([] { throw std::runtime_error("broken"); }), kU_ErrInternal);
    EXPECT_EQ(host.Reports(), std::vector<std::string>({"Out of memory. (0x4, 8)",
                                                        "Internal error: broken (0x13a80003, 8)"}));
}

// What the host was asked to register, and its answer.
struct Registry {
    std::string matchName;
    QNGP_DeathHook hook = nullptr;
    int32_t answer = 0;
} gRegistry;

constexpr QNGP_RegisterSuite6 kRegisterSuite{
    [](QNGP_Version16, QNGP_Version16, int32_t, int64_t, const char* match, const char*,
       const QNGP_ArtisanEntryPoints*) {
        gRegistry.matchName = match;
        return gRegistry.answer;
    },
    [](int32_t, QNGP_DeathHook deathHook, int64_t) {
        gRegistry.hook = deathHook;
        return int32_t{0};
    },
};

TEST(Registration, RegistersTheArtisanOrReturnsWhyNot) {
    struct Case {
        const char* name;
        bool served;
        int32_t answer, result;
        std::vector<std::string> reports;
    };
    const Case kCases[] = {
        {"registered", true, 0, 0, {}},
        {"host refuses", true, 0x77, 0x77, {}},
        {"no register suite", false, 0, 13, {kMissingSuite}},
    };
    for (const Case& c : kCases) {
        SCOPED_TRACE(c.name);
        gRegistry = Registry{};
        gRegistry.answer = c.answer;
        FakeHost host;
        if (c.served) host.Serve(kQNGP_RegisterSuite, 6, &kRegisterSuite);
        int64_t global = 0;
        EXPECT_EQ(ORM_Main(host.Basic(), 1, 0, -42, &global), c.result);
        EXPECT_EQ(global, -42);  // the plug-in id, sign-extended
        EXPECT_EQ(gRegistry.matchName, c.served ? "VLMR Ormond" : "");
        EXPECT_EQ(gRegistry.hook, c.result == 0 ? &ORM_DeathHook : nullptr);
        EXPECT_EQ(host.Reports(), c.reports);
        EXPECT_EQ(host.Held(), 0);
        EXPECT_EQ(ORM_DeathHook(-42, 0), 0);  // as the host calls it, even after a failure
    }
}

TEST(AboutBox, MissingUISuiteIsReportedAndReturnsThirteen) {
    FakeHost host;
    const QNGP_InData in{host.Basic(), 5};
    EXPECT_EQ(ORM_AboutBox(&in), 13);
    EXPECT_EQ(host.Reports(), std::vector<std::string>{"PNG ZEL Suite missing (0, 4)"});
}

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
    EXPECT_EQ(host.Reports(), std::vector{kMissingSuite});
    EXPECT_EQ(FakeHost::Of(options).locks, 0);
    EXPECT_EQ(host.Held(), 0);
}

}  // namespace
