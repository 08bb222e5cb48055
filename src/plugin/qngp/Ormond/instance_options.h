// The options of one renderer instance, kept by the host as a memory handle, and their flattened
// form, which the host stores with the project.
#pragma once

#include <cstdint>

#include "qngp_suites.h"

// The live record, in native byte order.
struct ORM_InstanceOptions {
    int32_t majorVersion;
    int32_t minorVersion;
    int32_t shadowMapSizeChoice;  // index into the shadow map size popup
    int32_t accepted;             // set by the options dialog: closed with OK
};
static_assert(sizeof(ORM_InstanceOptions) == 16);

inline constexpr int32_t kORM_OptionsMajorVersion = 1;
inline constexpr int32_t kORM_OptionsMinorVersion = 0;

// The flattened form: major version, minor version and choice, each 32-bit big-endian.
inline constexpr uint32_t kORM_FlattenedOptionsSize = 12;

// Makes a new options handle from a flattened form, or with choice 0 when there is none or it is
// of another version.
int32_t ORM_InstanceSetUp(const QNGP_InData* in, QNGP_HostHandle, QNGP_HostHandle, QNGP_HostHandle,
                          QNGP_HostHandle, QNGP_MemHandle flattened, QNGP_MemHandle* options);

int32_t ORM_InstanceSetDown(const QNGP_InData* in, QNGP_HostHandle, QNGP_HostHandle,
                            QNGP_HostHandle, QNGP_MemHandle options);

// Makes a new flattened handle from an options handle; with none, does nothing.
int32_t ORM_FlattenInstance(const QNGP_InData* in, QNGP_HostHandle, QNGP_HostHandle,
                            QNGP_HostHandle, QNGP_MemHandle options, QNGP_MemHandle* flattened);

// Shows the options dialog on the instance's options. *changed becomes 1 only when the user
// pressed OK with another choice than before. Returns the dialog's result.
int32_t ORM_InstanceDialog(const QNGP_InData* in, QNGP_HostHandle, QNGP_HostHandle, QNGP_HostHandle,
                           QNGP_MemHandle options, int32_t* changed);
