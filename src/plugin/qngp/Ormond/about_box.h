// The about box: the plug-in's name and version in the host's note box.
#pragma once

#include <cstdint>

#include "qngp_suites.h"

int32_t ORM_AboutBox(const QNGP_InData* in);
