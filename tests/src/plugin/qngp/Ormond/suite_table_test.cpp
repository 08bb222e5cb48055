#include "suite_table.h"

#include <gtest/gtest.h>

#include <new>
#include <stdexcept>
#include <string>
#include <vector>

#include "entry_guard.h"
#include "plugin_test_support.h"

namespace {

using ormond_test::FakeHost;

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
        EXPECT_EQ(host.Reports(), std::vector<std::string>{
                                      "Ostrel 3D: Could not acquire TOMA suite. (0x13a80002, 8)"});
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

}  // namespace
