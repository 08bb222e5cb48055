// The render entry: one frame of a comp, from the host's call to the frame driver and back.
#pragma once

#include <cstdint>

#include "qngp_suites.h"
#include "suite_table.h"

inline constexpr char kORM_SettingsSection[] = "Tessary 3D";
inline constexpr char kORM_MultiprocessingKey[] = "Enable Multiprocessing";

// The user's "Enable Multiprocessing" application setting; on when it is missing.
bool ORM_MultiprocessingSetting(ORM_SuiteTable& suites);

// Renders one frame; the handles after the in-data are the host's (the third is the render
// context, the fifth the instance options). Everything the frame took is given back on every
// way out, the options unlocked.
int32_t ORM_Render(const QNGP_InData* in, QNGP_HostHandle first, QNGP_HostHandle second,
                   QNGP_RenderContextH renderContext, QNGP_HostHandle fourth,
                   QNGP_MemHandle options, QNGP_HostHandle sixth);
