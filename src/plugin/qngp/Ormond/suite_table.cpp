#include "suite_table.h"

#include <iterator>

#include "resources/ormond_strings.h"
#include "u_report.h"
#include "u_strings.h"

namespace {

constexpr ORM_SuiteName kNames[] = {
    {kQNGP_RegisterSuite, 6},    {kQNGP_MemorySuite, 1},  {kQNGP_PersistentDataSuite, 3},
    {kQNGP_CanvasSuite, 10},     {kQNGP_CanvasSuite, 13}, {kQNGP_CompSuite, 9},
    {kQNGP_CompSuite, 14},       {kQNGP_ItemSuite, 7},    {kQNGP_CameraSuite, 2},
    {kQNGP_LightSuite, 1},       {kQNGP_LayerSuite, 10},  {kQNGP_StreamSuite, 7},
    {kPF_ColorSettingsSuite, 1}, {kQNGP_IterateSuite, 1},
};
static_assert(std::size(kNames) == static_cast<size_t>(ORM_SuiteSlot::kCount));

constexpr size_t kMessageBufferSize = 1000;

[[noreturn]] void ReportMissingSuite() {
    char message[kMessageBufferSize];
    U_SubString(message, sizeof message, "^1: ^2", ORM_String(ORM_StringId::kName),
                ORM_String(ORM_StringId::kSuiteMissing));
    Up_ReportErrString(kORM_SuiteMissingReportCode, 8, message);
    throw kORM_ErrSuiteMissing;
}

}  // namespace

const ORM_SuiteName& ORM_SuiteNameOf(ORM_SuiteSlot slot) {
    return kNames[static_cast<size_t>(slot)];
}

ORM_SuiteTable::~ORM_SuiteTable() {
    for (size_t i = 0; i < slots_.size(); ++i) {
        if (slots_[i]) basic_->ReleaseSuite(kNames[i].name, kNames[i].version);
    }
}

const void* ORM_SuiteTable::Acquire(ORM_SuiteSlot slot) {
    const void*& suite = slots_[static_cast<size_t>(slot)];
    if (suite) return suite;
    const ORM_SuiteName& name = ORM_SuiteNameOf(slot);
    const void* acquired = nullptr;
    if (!basic_ || basic_->AcquireSuite(name.name, name.version, &acquired) != 0 || !acquired) {
        ReportMissingSuite();
    }
    suite = acquired;
    return suite;
}
