// The plug-in's start: its strings, its registration as an artisan, and the death hook that
// undoes the string set-up when the host unloads it.
#pragma once

#include <cstdint>

#include "qngp_suites.h"

inline constexpr char kORM_MatchName[] = "VLMR Ormond";

// The entry points handed to the host at registration: about box, instance set-up, set-down,
// flatten and dialog, and render; the unused slots stay null.
extern const QNGP_ArtisanEntryPoints ORM_ArtisanEntryPoints;

// What GPMain_Ormond does: registers the strings, the artisan and the death hook. *global
// receives the plug-in id, the only datum kept between calls.
int32_t ORM_Main(const QNGP_BasicSuite* basic, int32_t hostMajor, int32_t hostMinor,
                 int32_t pluginId, int64_t* global);

// Drops the plug-in's and the renderer's string caches; the result of the last.
int32_t ORM_DeathHook(int32_t pluginId, int64_t reference);
