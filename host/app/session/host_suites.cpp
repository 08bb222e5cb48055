#include "session/frame_suites.h"
#include "suites/iterate_suite.h"
#include "suites/memory_suite.h"
#include "suites/persistent_data_suite.h"

namespace ostrel {

HostSuites::HostSuites() {
    auto serve = [&](const char* name, int32_t version, const void* table) {
        served_.push_back(std::make_unique<ScopedSuite>(name, version, table));
    };
    serve(kQNGP_MemorySuite, 1, MemorySuite());
    serve(kQNGP_PersistentDataSuite, 3, PersistentDataSuite());
    serve(kQNGP_IterateSuite, 1, IterateSuite());
    serve(kQNGP_CanvasSuite, 10, CanvasSuite());
    serve(kQNGP_CanvasSuite, 13, CanvasSuite());
    serve(kQNGP_CompSuite, 9, CompSuite());
    serve(kQNGP_CompSuite, 14, CompSuite());
    serve(kQNGP_ItemSuite, 7, ItemSuite());
    serve(kQNGP_CameraSuite, 2, CameraSuite());
    serve(kQNGP_LightSuite, 1, LightSuite());
    serve(kQNGP_LayerSuite, 10, LayerSuite());
    serve(kQNGP_StreamSuite, 7, StreamSuite());
    serve(kPF_ColorSettingsSuite, 1, ColorSettingsSuite());
    serve(kQN_ZELSuite, 1, ZELSuite());
}

}  // namespace ostrel
