// Reading a layer's streams (QNGP_Stream) through the Stream suite.
#pragma once

#include <cstdint>

#include "qngp_suites.h"
#include "suite_table.h"

// The stream's value on the layer at that time, in layer time.
QNGP_StreamValue ORM_StreamValue(ORM_SuiteTable& suites, QNGP_LayerH layer, QNGP_Stream stream,
                                 const T_Time& time);

// A one-number stream.
inline double ORM_StreamNumber(ORM_SuiteTable& suites, QNGP_LayerH layer, QNGP_Stream stream,
                               const T_Time& time) {
    return ORM_StreamValue(suites, layer, stream, time).v[0];
}

// A percentage stream as a fraction.
inline double ORM_StreamFraction(ORM_SuiteTable& suites, QNGP_LayerH layer, QNGP_Stream stream,
                                 const T_Time& time) {
    return ORM_StreamNumber(suites, layer, stream, time) / 100;
}
