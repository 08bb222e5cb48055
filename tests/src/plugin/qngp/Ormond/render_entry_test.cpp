#include "render_entry.h"

#include <gtest/gtest.h>

#include <map>
#include <string>
#include <vector>

#include "instance_options.h"
#include "plugin_test_support.h"
#include "u_memory.h"

namespace {

using ormond_test::MemoryHost;
using ormond_test::SuiteServer;

// "QNGP Persistent Data Suite" 3 over a map; a missing key answers the caller's default.
struct Settings {
    static Settings& Get() {
        static Settings settings;
        return settings;
    }
    std::map<std::pair<std::string, std::string>, int32_t> values;
    std::vector<int32_t> defaultsAsked;

    static int32_t GetApplicationBlob(QNGP_PersistentBlobH* blob) {
        *blob = reinterpret_cast<QNGP_PersistentBlobH>(&Get());
        return 0;
    }
    static int32_t GetLong(QNGP_PersistentBlobH, const char* section, const char* key,
                           int32_t defaultValue, int32_t* value) {
        Settings& s = Get();
        s.defaultsAsked.push_back(defaultValue);
        auto found = s.values.find({section, key});
        *value = found == s.values.end() ? defaultValue : found->second;
        return 0;
    }
};

constexpr QNGP_PersistentDataSuite3 kPersistentData{&Settings::GetApplicationBlob,
                                                    &Settings::GetLong};

TEST(RenderEntry, MultiprocessingSettingIsOnUnlessTheUserTurnedItOff) {
    struct Case {
        const char* name;
        bool stored;
        int32_t value;
        bool enabled;
    };
    const Case kCases[] = {
        {"missing", false, 0, true},
        {"0", true, 0, false},
        {"1", true, 1, true},
        {"2", true, 2, true},
    };
    for (const Case& c : kCases) {
        SCOPED_TRACE(c.name);
        Settings::Get() = Settings{};
        if (c.stored) Settings::Get().values[{"Tessary 3D", "Enable Multiprocessing"}] = c.value;
        SuiteServer server;
        server.Serve(kQNGP_PersistentDataSuite, 3, &kPersistentData);
        {
            ORM_SuiteTable suites(server.Basic());
            EXPECT_EQ(ORM_MultiprocessingSetting(suites), c.enabled);
        }
        EXPECT_EQ(Settings::Get().defaultsAsked, std::vector<int32_t>{1});
        EXPECT_EQ(server.Held(), 0);
    }
}

// A host whose comp has three layers to render and fails to give the first one's context:
// enough to see what a frame that fails inside scene capture leaves behind.
constexpr int32_t kHostFailure = 0x4242;
int gComp, gItem;

QNGP_CanvasSuite10 FailingCanvas() {
    QNGP_CanvasSuite10 canvas{};
    canvas.GetCompToRender = [](QNGP_RenderContextH, QNGP_CompH* comp) {
        *comp = reinterpret_cast<QNGP_CompH>(&gComp);
        return int32_t{0};
    };
    canvas.GetCompDestination = [](QNGP_RenderContextH, QNGP_CompH, PF_World** world) {
        *world = nullptr;
        return int32_t{0};
    };
    canvas.GetRenderTime = [](QNGP_RenderContextH, T_Time* time, T_Time* step) {
        *time = {0, 24};
        *step = {1, 24};
        return int32_t{0};
    };
    canvas.GetDownsample = [](QNGP_RenderContextH, int16_t* dx, int16_t* dy) {
        *dx = *dy = 1;
        return int32_t{0};
    };
    canvas.GetFieldRender = [](QNGP_RenderContextH, int32_t* mode) {
        *mode = 0;
        return int32_t{0};
    };
    canvas.GetNumLayersToRender = [](QNGP_RenderContextH, int32_t* count) {
        *count = 3;
        return int32_t{0};
    };
    canvas.GetNthLayerContext = [](QNGP_RenderContextH, int32_t, QNGP_LayerContextH*) {
        return kHostFailure;
    };
    return canvas;
}

const QNGP_CanvasSuite10 kFailingCanvas = FailingCanvas();
const QNGP_CompSuite9 kComp{
    [](QNGP_CompH, int32_t* flags) {
        *flags = 0;
        return int32_t{0};
    },
    [](QNGP_CompH, QNGP_ItemH* item) {
        *item = reinterpret_cast<QNGP_ItemH>(&gItem);
        return int32_t{0};
    },
};
const QNGP_ItemSuite7 kItem{
    [](QNGP_ItemH, QNGP_Ratio* ratio) {
        *ratio = {1, 1};
        return int32_t{0};
    },
    nullptr,
};
const QNGP_LayerSuite10 kLayers{};  // not reached: the layer contexts fail first

TEST(RenderEntry, FrameFailingInCaptureFreesTheSceneAndUnlocksTheOptions) {
    Settings::Get() = Settings{};
    SuiteServer server;
    MemoryHost memory;
    server.Serve(kQNGP_PersistentDataSuite, 3, &kPersistentData);
    server.Serve(kQNGP_MemorySuite, 1, MemoryHost::Suite());
    server.Serve(kQNGP_CanvasSuite, 10, &kFailingCanvas);
    server.Serve(kQNGP_CompSuite, 9, &kComp);
    server.Serve(kQNGP_ItemSuite, 7, &kItem);
    server.Serve(kQNGP_LayerSuite, 10, &kLayers);
    QNGP_MemHandle options = memory.Make(std::vector<uint8_t>(sizeof(ORM_InstanceOptions)));
    const QNGP_InData in{server.Basic(), 9};

    int64_t start = U_AccountedBytes();
    EXPECT_EQ(ORM_Render(&in, nullptr, nullptr, nullptr, nullptr, options, nullptr), kHostFailure);
    EXPECT_EQ(U_AccountedBytes(), start);
    EXPECT_EQ(MemoryHost::Of(options).locks, 0);
    EXPECT_EQ(server.Held(), 0);
}

TEST(RenderEntry, MissingSuiteEndsTheFrameWithThirteenBeforeAnythingIsTaken) {
    SuiteServer server;
    MemoryHost memory;
    server.Serve(kQNGP_PersistentDataSuite, 3, &kPersistentData);
    server.Serve(kQNGP_MemorySuite, 1, MemoryHost::Suite());
    QNGP_MemHandle options = memory.Make(std::vector<uint8_t>(sizeof(ORM_InstanceOptions)));
    const QNGP_InData in{server.Basic(), 9};
    ormond_test::ReportLog log;
    EXPECT_EQ(ORM_Render(&in, nullptr, nullptr, nullptr, nullptr, options, nullptr), 13);
    EXPECT_EQ(MemoryHost::Of(options).locks, 0);
    EXPECT_EQ(server.Held(), 0);
}

}  // namespace
