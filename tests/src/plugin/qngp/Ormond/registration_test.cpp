#include "registration.h"

#include <gtest/gtest.h>

#include <string>
#include <tuple>

#include "about_box.h"
#include "plugin_test_support.h"
#include "renderer/scene/messages.h"
#include "resources/ormond_strings.h"
#include "zel_ui.h"

namespace {

using ormond_test::ReportLog;
using ormond_test::SuiteServer;

// What the host was asked to register.
struct Registry {
    static Registry& Get() {
        static Registry registry;
        return registry;
    }
    QNGP_Version16 api{}, artisan{};
    int32_t pluginId = 0;
    int64_t reference = 0;
    std::string matchName, displayName;
    const QNGP_ArtisanEntryPoints* entries = nullptr;
    int32_t hookPluginId = 0;
    QNGP_DeathHook hook = nullptr;
    int64_t hookReference = -1;
    int32_t artisanResult = 0;

    static int32_t RegisterArtisan(QNGP_Version16 a, QNGP_Version16 b, int32_t id, int64_t ref,
                                   const char* match, const char* display,
                                   const QNGP_ArtisanEntryPoints* table) {
        Registry& r = Get();
        r = Registry{a, b, id, ref, match, display, table, 0, nullptr, -1, r.artisanResult};
        return r.artisanResult;
    }
    static int32_t RegisterDeathHook(int32_t id, QNGP_DeathHook deathHook, int64_t ref) {
        Registry& r = Get();
        r.hookPluginId = id;
        r.hook = deathHook;
        r.hookReference = ref;
        return 0;
    }
};

constexpr QNGP_RegisterSuite6 kRegisterSuite{&Registry::RegisterArtisan,
                                             &Registry::RegisterDeathHook};

TEST(Registration, RegistersTheArtisanAndItsDeathHook) {
    Registry::Get() = Registry{};
    SuiteServer server;
    server.Serve(kQNGP_RegisterSuite, 6, &kRegisterSuite);
    int64_t global = 0;
    ASSERT_EQ(ORM_Main(server.Basic(), 1, 0, -42, &global), 0);

    const Registry& r = Registry::Get();
    EXPECT_EQ(global, -42);  // the plug-in id, sign-extended
    EXPECT_EQ(std::tuple(r.api.major, r.api.minor, r.artisan.major, r.artisan.minor),
              std::tuple(1, 0, 1, 0));
    EXPECT_EQ(r.pluginId, -42);
    EXPECT_EQ(r.reference, -42);
    EXPECT_EQ(r.matchName, "VLMR Ormond");
    EXPECT_EQ(r.displayName, "Ostrel 3D");
    ASSERT_EQ(r.entries, &ORM_ArtisanEntryPoints);
    EXPECT_EQ(r.hookPluginId, -42);
    EXPECT_EQ(r.hookReference, 0);
    EXPECT_EQ(server.Held(), 0);

    // The strings are served from the caches until the death hook drops them.
    EXPECT_STREQ(ORM_String(ORM_StringId::kOptionsHandleName), "Tessary 3D options data");
    EXPECT_STREQ(SY_LookupString(SY_Message::kName), "Tessary 3D");
    ASSERT_NE(r.hook, nullptr);
    EXPECT_EQ(r.hook(-42, 0), 0);
    EXPECT_EQ(ORM_UnregisterStrings(), 0);  // nothing left to drop
}

TEST(Registration, EntryTableFillsTheArtisansSlotsOnly) {
    const QNGP_ArtisanEntryPoints& e = ORM_ArtisanEntryPoints;
    EXPECT_EQ(e.slot0, nullptr);
    EXPECT_EQ(e.slot1, nullptr);
    EXPECT_NE(e.about, nullptr);
    EXPECT_NE(e.instanceSetUp, nullptr);
    EXPECT_NE(e.instanceSetDown, nullptr);
    EXPECT_NE(e.flattenInstance, nullptr);
    EXPECT_EQ(e.instanceDialog, nullptr);
    EXPECT_EQ(e.slot7, nullptr);
    EXPECT_NE(e.render, nullptr);
    EXPECT_EQ(e.slot9, nullptr);
    EXPECT_EQ(e.slot10, nullptr);
}

TEST(Registration, HostRefusalIsReturned) {
    Registry::Get() = Registry{};
    Registry::Get().artisanResult = 0x77;
    SuiteServer server;
    server.Serve(kQNGP_RegisterSuite, 6, &kRegisterSuite);
    int64_t global = 0;
    EXPECT_EQ(ORM_Main(server.Basic(), 1, 0, 3, &global), 0x77);
    EXPECT_EQ(Registry::Get().hook, nullptr);
    EXPECT_EQ(server.Held(), 0);
    ORM_DeathHook(3, 0);
}

TEST(Registration, MissingRegisterSuiteReturnsThirteen) {
    SuiteServer server;
    ReportLog log;
    int64_t global = 0;
    EXPECT_EQ(ORM_Main(server.Basic(), 1, 0, 3, &global), 13);
    ASSERT_EQ(ReportLog::entries().size(), 1u);
    EXPECT_EQ(ReportLog::entries()[0].text, "Ostrel 3D: Could not acquire TOMA suite.");
    ORM_DeathHook(3, 0);
}

// The note box as the host would show it.
struct Note {
    static Note& Get() {
        static Note note;
        return note;
    }
    void* supplier = nullptr;
    void* parent = nullptr;
    std::u16string title, text;
    int32_t shown = 0;

    static void Present(void* drawingSupplier, const std::u16string& noteTitle,
                        const std::u16string& noteText, void* parentNode) {
        Note& n = Get();
        n = Note{drawingSupplier, parentNode, noteTitle, noteText, n.shown + 1};
    }
};

int gSupplier, gParent;
constexpr QN_ZELSuite1 kZELSuite{
    [](void** supplier) {
        *supplier = &gSupplier;
        return int32_t{0};
    },
    [](void** node) {
        *node = &gParent;
        return int32_t{0};
    },
};

TEST(AboutBox, ShowsNameAndVersionInANote) {
    Note::Get() = Note{};
    auto previous = zelui::dialogs::messagebox::SetNotePresenter(&Note::Present);
    SuiteServer server;
    server.Serve(kQN_ZELSuite, 1, &kZELSuite);
    const QNGP_InData in{server.Basic(), 5};
    EXPECT_EQ(ORM_AboutBox(&in), 0);
    zelui::dialogs::messagebox::SetNotePresenter(previous);

    const Note& note = Note::Get();
    EXPECT_EQ(note.shown, 1);
    EXPECT_EQ(note.title, u"Ostrel 3D");
    EXPECT_EQ(note.text, u"Ostrel 3D (Tessary 3D) Renderer plug-in#{cr}Version 1.1");
    EXPECT_EQ(note.supplier, &gSupplier);
    EXPECT_EQ(note.parent, &gParent);
    EXPECT_EQ(server.Held(), 0);
}

TEST(AboutBox, MissingUISuiteIsReportedAndReturnsThirteen) {
    SuiteServer server;
    ReportLog log;
    const QNGP_InData in{server.Basic(), 5};
    EXPECT_EQ(ORM_AboutBox(&in), 13);
    ASSERT_EQ(ReportLog::entries().size(), 1u);
    EXPECT_EQ(ReportLog::entries()[0].text, "PNG ZEL Suite missing");
    EXPECT_EQ(ReportLog::entries()[0].code, 0);
    EXPECT_EQ(ReportLog::entries()[0].severity, 4);
}

}  // namespace
