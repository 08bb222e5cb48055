// The library's only export, called once by the host when it loads the plug-in.
#include <type_traits>

#include "plugin_export.h"
#include "qngp_suites.h"
#include "registration.h"

ORM_EXPORT int32_t GPMain_Ormond(const QNGP_BasicSuite* basic, int32_t hostMajor, int32_t hostMinor,
                                 int32_t pluginId, int64_t* global) {
    return ORM_Main(basic, hostMajor, hostMinor, pluginId, global);
}

// The host casts the export to this type.
static_assert(std::is_same_v<decltype(&GPMain_Ormond), QNGP_PluginMain>);
