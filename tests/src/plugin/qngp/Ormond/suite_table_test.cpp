#include "suite_table.h"

#include <gtest/gtest.h>

#include <new>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

#include "entry_guard.h"
#include "plugin_test_support.h"

namespace {

using ormond_test::ReportLog;
using ormond_test::SuiteServer;
using NameAndVersion = std::pair<std::string, int32_t>;

const QNGP_CompSuite9 kComp9{};
const QNGP_CompSuite14 kComp14{};
const QNGP_ItemSuite7 kItem7{};

TEST(SuiteTable, AcquiresOncePerNameAndVersionAndReleasesEach) {
    SuiteServer server;
    server.Serve(kQNGP_CompSuite, 9, &kComp9);
    server.Serve(kQNGP_CompSuite, 14, &kComp14);
    server.Serve(kQNGP_ItemSuite, 7, &kItem7);
    {
        ORM_SuiteTable suites(server.Basic());
        EXPECT_EQ(server.Held(), 0);
        EXPECT_EQ(&suites.Get<QNGP_CompSuite9>(), &kComp9);
        EXPECT_EQ(&suites.Get<QNGP_CompSuite14>(), &kComp14);
        EXPECT_EQ(&suites.Get<QNGP_CompSuite9>(), &kComp9);
        EXPECT_EQ(server.Held(), 2);
    }
    EXPECT_EQ(server.Held(), 0);
    const std::vector<NameAndVersion> released{{"QNGP Comp Suite", 9}, {"QNGP Comp Suite", 14}};
    EXPECT_EQ(server.Released(), released);
}

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
        SuiteServer server;
        server.SetMissingError(c.missingError);
        ReportLog log;
        int32_t thrown = 0;
        {
            ORM_SuiteTable suites(c.nullBasic ? nullptr : server.Basic());
            try {
                suites.Get<QNGP_LayerSuite10>();
            } catch (int32_t code) {
                thrown = code;
            }
        }
        EXPECT_EQ(thrown, 13);
        ASSERT_EQ(ReportLog::entries().size(), 1u);
        EXPECT_EQ(ReportLog::entries()[0].text, "Ostrel 3D: Could not acquire TOMA suite.");
        EXPECT_EQ(ReportLog::entries()[0].code, 0x13A80002);
        EXPECT_EQ(ReportLog::entries()[0].severity, 8);
        EXPECT_EQ(server.Held(), 0);
        EXPECT_TRUE(server.Released().empty());
    }
}

TEST(SuiteTable, SlotsCarryTheHostsNamesAndVersions) {
    struct Case {
        ORM_SuiteSlot slot;
        const char* name;
        int32_t version;
    };
    const Case kCases[] = {
        {ORM_SuiteSlot::kRegister6, "QNGP Register Suite", 6},
        {ORM_SuiteSlot::kMemory1, "QNGP Memory Suite", 1},
        {ORM_SuiteSlot::kPersistentData3, "QNGP Persistent Data Suite", 3},
        {ORM_SuiteSlot::kCanvas10, "QNGP Canvas Suite", 10},
        {ORM_SuiteSlot::kCanvas13, "QNGP Canvas Suite", 13},
        {ORM_SuiteSlot::kComp9, "QNGP Comp Suite", 9},
        {ORM_SuiteSlot::kComp14, "QNGP Comp Suite", 14},
        {ORM_SuiteSlot::kItem7, "QNGP Item Suite", 7},
        {ORM_SuiteSlot::kCamera2, "QNGP Camera Suite", 2},
        {ORM_SuiteSlot::kLight1, "QNGP Light Suite", 1},
        {ORM_SuiteSlot::kLayer10, "QNGP Layer Suite", 10},
        {ORM_SuiteSlot::kStream7, "QNGP Stream Suite", 7},
        {ORM_SuiteSlot::kColorSettings1, "PF Color Settings Suite", 1},
        {ORM_SuiteSlot::kIterate1, "QNGP Iterate Suite", 1},
    };
    for (const Case& c : kCases) {
        EXPECT_STREQ(ORM_SuiteNameOf(c.slot).name, c.name);
        EXPECT_EQ(ORM_SuiteNameOf(c.slot).version, c.version);
    }
}

TEST(EntryGuard, TurnsWhatIsThrownIntoTheResult) {
    ReportLog log;
    EXPECT_EQ(ORM_Guard([] {}), 0);
    EXPECT_EQ(ORM_Guard([] { throw int32_t{0x1234}; }), 0x1234);
    EXPECT_TRUE(ReportLog::entries().empty());

    EXPECT_EQ(ORM_Guard([] { throw std::bad_alloc(); }), 4);
    EXPECT_EQ(ORM_Guard([] { throw std::runtime_error("broken"); }), kU_ErrInternal);
    ASSERT_EQ(ReportLog::entries().size(), 2u);
    EXPECT_EQ(ReportLog::entries()[1].text, "Internal error: broken");
}

}  // namespace
