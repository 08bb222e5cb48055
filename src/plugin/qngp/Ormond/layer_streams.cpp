#include "layer_streams.h"

QNGP_StreamValue ORM_StreamValue(ORM_SuiteTable& suites, QNGP_LayerH layer, QNGP_Stream stream,
                                 const T_Time& time) {
    QNGP_StreamValue value{};
    ORM_Check(suites.Get<QNGP_StreamSuite7>().GetLayerStreamValue(
        layer, static_cast<int32_t>(stream), kQNGP_TimeModeLayer, &time, 0, &value));
    return value;
}
