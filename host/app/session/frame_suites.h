// The suites a frame is served through, and the registration of every suite of the host.
#pragma once

#include <memory>
#include <vector>

#include "qngp_suites.h"
#include "suites/suite_registry.h"

namespace ostrel {

const QNGP_CanvasSuite13* CanvasSuite();
const QNGP_CompSuite14* CompSuite();
const QNGP_ItemSuite7* ItemSuite();
const QNGP_CameraSuite2* CameraSuite();
const QNGP_LightSuite1* LightSuite();
const QNGP_LayerSuite10* LayerSuite();
const QNGP_StreamSuite7* StreamSuite();
const PF_ColorSettingsSuite1* ColorSettingsSuite();
const QN_ZELSuite1* ZELSuite();

// Serves every suite of the host by name and version while it lives: memory, persistent data,
// iterate, and the frame's suites. The Canvas and Comp suites are served under both versions
// from one table whose first part is the older version's.
class HostSuites {
public:
    HostSuites();

private:
    std::vector<std::unique_ptr<ScopedSuite>> served_;
};

}  // namespace ostrel
