// ORM_SuiteTable: the per-call access to the host's suites. Every entry point builds one on its
// stack; a suite is acquired by name and version the first time it is asked for, and every
// suite acquired is released when the table goes, on every way out of the call.
#pragma once

#include <array>
#include <cstdint>

#include "pf_iterate.h"
#include "qngp_suites.h"

// Throws a host's or a library's non-zero result as the integer the entry guard returns.
inline void ORM_Check(int32_t error) {
    if (error) throw error;
}

// Thrown when a suite cannot be acquired.
inline constexpr int32_t kORM_ErrSuiteMissing = 13;
// Reported with the message of a suite that cannot be acquired.
inline constexpr int32_t kORM_SuiteMissingReportCode = 0x13A80002;

enum class ORM_SuiteSlot : int32_t {
    kRegister6,
    kMemory1,
    kPersistentData3,
    kCanvas10,
    kCanvas13,
    kComp9,
    kComp14,
    kItem7,
    kCamera2,
    kLight1,
    kLayer10,
    kStream7,
    kColorSettings1,
    kIterate1,
    kCount,
};

struct ORM_SuiteName {
    const char* name;
    int32_t version;
};

// The name and version of each slot.
const ORM_SuiteName& ORM_SuiteNameOf(ORM_SuiteSlot slot);

// The slot that serves a suite type.
template <class Suite>
struct ORM_SlotOf;

#define ORM_SUITE_SLOT(Type, Slot)                                  \
    template <>                                                     \
    struct ORM_SlotOf<Type> {                                       \
        static constexpr ORM_SuiteSlot kSlot = ORM_SuiteSlot::Slot; \
    }
ORM_SUITE_SLOT(QNGP_RegisterSuite6, kRegister6);
ORM_SUITE_SLOT(QNGP_MemorySuite1, kMemory1);
ORM_SUITE_SLOT(QNGP_PersistentDataSuite3, kPersistentData3);
ORM_SUITE_SLOT(QNGP_CanvasSuite10, kCanvas10);
ORM_SUITE_SLOT(QNGP_CanvasSuite13, kCanvas13);
ORM_SUITE_SLOT(QNGP_CompSuite9, kComp9);
ORM_SUITE_SLOT(QNGP_CompSuite14, kComp14);
ORM_SUITE_SLOT(QNGP_ItemSuite7, kItem7);
ORM_SUITE_SLOT(QNGP_CameraSuite2, kCamera2);
ORM_SUITE_SLOT(QNGP_LightSuite1, kLight1);
ORM_SUITE_SLOT(QNGP_LayerSuite10, kLayer10);
ORM_SUITE_SLOT(QNGP_StreamSuite7, kStream7);
ORM_SUITE_SLOT(PF_ColorSettingsSuite1, kColorSettings1);
ORM_SUITE_SLOT(QNGP_IterateSuite1, kIterate1);
#undef ORM_SUITE_SLOT

class ORM_SuiteTable {
public:
    // A null basic suite makes every acquisition fail.
    explicit ORM_SuiteTable(const QNGP_BasicSuite* basic) : basic_(basic) {}
    ~ORM_SuiteTable();
    ORM_SuiteTable(const ORM_SuiteTable&) = delete;
    ORM_SuiteTable& operator=(const ORM_SuiteTable&) = delete;

    // The suite, acquired on first use. A suite the host cannot give is reported to the user and
    // thrown as kORM_ErrSuiteMissing.
    template <class Suite>
    const Suite& Get() {
        return *static_cast<const Suite*>(Acquire(ORM_SlotOf<Suite>::kSlot));
    }

private:
    const void* Acquire(ORM_SuiteSlot slot);

    const QNGP_BasicSuite* basic_;
    std::array<const void*, static_cast<size_t>(ORM_SuiteSlot::kCount)> slots_{};
};
