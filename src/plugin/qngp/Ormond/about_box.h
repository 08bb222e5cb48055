// The about box: the plug-in's name and version in the host's note box.
#pragma once

#include <cstdint>

#include "qngp_suites.h"

// Reported, and thrown as 13, when the host has no UI suite to show the note with.
inline constexpr char kORM_ZELSuiteMissing[] = "PNG ZEL Suite missing";

int32_t ORM_AboutBox(const QNGP_InData* in);
