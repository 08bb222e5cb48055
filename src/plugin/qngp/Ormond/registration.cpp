#include "registration.h"

#include "about_box.h"
#include "entry_guard.h"
#include "instance_options.h"
#include "render_entry.h"
#include "renderer/scene/messages.h"
#include "resources/ormond_strings.h"
#include "suite_table.h"

const QNGP_ArtisanEntryPoints ORM_ArtisanEntryPoints = {
    .slot0 = nullptr,
    .slot1 = nullptr,
    .about = &ORM_AboutBox,
    .instanceSetUp = &ORM_InstanceSetUp,
    .instanceSetDown = &ORM_InstanceSetDown,
    .flattenInstance = &ORM_FlattenInstance,
    .instanceDialog = &ORM_InstanceDialog,
    .slot7 = nullptr,
    .render = &ORM_Render,
    .slot9 = nullptr,
    .slot10 = nullptr,
};

int32_t ORM_Main(const QNGP_BasicSuite* basic, int32_t, int32_t, int32_t pluginId,
                 int64_t* global) {
    if (int32_t error = ORM_RegisterStrings()) return error;
    if (int32_t error = SY_RegisterStrings()) return error;
    return ORM_Guard([&] {
        ORM_SuiteTable suites(basic);
        *global = pluginId;
        const auto& registry = suites.Get<QNGP_RegisterSuite6>();
        ORM_Check(registry.RegisterArtisan({1, 0}, {1, 0}, pluginId, pluginId, kORM_MatchName,
                                           ORM_String(ORM_StringId::kName),
                                           &ORM_ArtisanEntryPoints));
        ORM_Check(registry.RegisterDeathHook(pluginId, &ORM_DeathHook, 0));
    });
}

int32_t ORM_DeathHook(int32_t, int64_t) {
    ORM_UnregisterStrings();
    return SY_UnregisterStrings();
}
