#include "registration.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "about_box.h"
#include "plugin_test_support.h"

namespace {

using ormond_test::FakeHost;

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
        {"no register suite",
         false,
         0,
         13,
         {"Ostrel 3D: Could not acquire TOMA suite. (0x13a80002, 8)"}},
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

}  // namespace
