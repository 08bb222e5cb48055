#include "instance_options.h"

#include "entry_guard.h"
#include "memory_handles.h"
#include "options_dialog.h"
#include "resources/ormond_strings.h"
#include "suite_table.h"
#include "u_cpu.h"

namespace {

int32_t FromBigEndian(uint32_t stored) {
    return static_cast<int32_t>(U_LongSwap(stored));
}

uint32_t ToBigEndian(int32_t value) {
    return U_LongSwap(static_cast<uint32_t>(value));
}

// The choice a flattened form carries; 0 for a form of another version or too short to be one.
int32_t ChoiceFromFlattened(const QNGP_MemorySuite1& memory, QNGP_MemHandle flattened) {
    uint32_t size = 0;
    ORM_Check(memory.GetHandleSize(flattened, &size));
    if (size < kORM_FlattenedOptionsSize) return 0;
    ORM_LockedHandle locked(memory, flattened);
    const uint32_t* stored = locked.As<uint32_t>();
    bool sameVersion = FromBigEndian(stored[0]) == kORM_OptionsMajorVersion &&
                       FromBigEndian(stored[1]) == kORM_OptionsMinorVersion;
    int32_t choice = FromBigEndian(stored[2]);
    locked.Unlock();
    return sameVersion ? choice : 0;
}

}  // namespace

int32_t ORM_InstanceSetUp(const QNGP_InData* in, QNGP_HostHandle, QNGP_HostHandle, QNGP_HostHandle,
                          QNGP_HostHandle, QNGP_MemHandle flattened, QNGP_MemHandle* options) {
    return ORM_Guard([&] {
        ORM_SuiteTable suites(in->basic);
        const auto& memory = suites.Get<QNGP_MemorySuite1>();
        ORM_NewHandle handle(memory, in->pluginId, ORM_String(ORM_StringId::kOptionsHandleName),
                             sizeof(ORM_InstanceOptions));
        {
            ORM_LockedHandle locked(memory, handle.Get());
            auto* record = locked.As<ORM_InstanceOptions>();
            record->majorVersion = kORM_OptionsMajorVersion;
            record->minorVersion = kORM_OptionsMinorVersion;
            record->shadowMapSizeChoice = flattened ? ChoiceFromFlattened(memory, flattened) : 0;
            locked.Unlock();
        }
        *options = handle.Release();
    });
}

int32_t ORM_InstanceSetDown(const QNGP_InData* in, QNGP_HostHandle, QNGP_HostHandle,
                            QNGP_HostHandle, QNGP_MemHandle options) {
    return ORM_Guard([&] {
        ORM_SuiteTable suites(in->basic);
        ORM_Check(suites.Get<QNGP_MemorySuite1>().FreeHandle(options));
    });
}

int32_t ORM_FlattenInstance(const QNGP_InData* in, QNGP_HostHandle, QNGP_HostHandle,
                            QNGP_HostHandle, QNGP_MemHandle options, QNGP_MemHandle* flattened) {
    return ORM_Guard([&] {
        if (!options) return;
        ORM_SuiteTable suites(in->basic);
        const auto& memory = suites.Get<QNGP_MemorySuite1>();
        ORM_NewHandle handle(memory, in->pluginId, ORM_String(ORM_StringId::kOptionsHandleName),
                             kORM_FlattenedOptionsSize);
        {
            ORM_LockedHandle record(memory, options);
            ORM_LockedHandle stored(memory, handle.Get());
            const auto* live = record.As<ORM_InstanceOptions>();
            auto* out = stored.As<uint32_t>();
            out[0] = ToBigEndian(live->majorVersion);
            out[1] = ToBigEndian(live->minorVersion);
            out[2] = ToBigEndian(live->shadowMapSizeChoice);
            stored.Unlock();
            record.Unlock();
        }
        *flattened = handle.Release();
    });
}

int32_t ORM_InstanceDialog(const QNGP_InData* in, QNGP_HostHandle, QNGP_HostHandle, QNGP_HostHandle,
                           QNGP_MemHandle options, int32_t* changed) {
    int32_t result = 0;
    int32_t failure = ORM_Guard([&] {
        ORM_SuiteTable suites(in->basic);
        ORM_LockedHandle locked(suites.Get<QNGP_MemorySuite1>(), options);
        auto* record = locked.As<ORM_InstanceOptions>();
        *changed = 0;
        int32_t before = record->shadowMapSizeChoice;
        result = ORM_RunOptionsDialog(in, record);
        if (result == 0 && record->accepted && record->shadowMapSizeChoice != before) *changed = 1;
        locked.Unlock();
    });
    return failure ? failure : result;
}
