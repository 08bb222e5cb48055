// The shadow map resolutions a user can choose for an instance, as the options popup lists them.
#pragma once

#include <cstdint>

inline constexpr int32_t kORM_ShadowMapSizeChoices = 9;

// Popup entries, "key=default text"; index 0 is "Comp Size", the others read their size.
extern const char* const ORM_ShadowMapSizeLabels[kORM_ShadowMapSizeChoices];

// The size in pixels for a choice: 0 ("Comp Size", the frame driver sizes the map from the
// output) for choice 0 and for a choice outside the popup, else the number its localised label
// reads.
int32_t ORM_ShadowMapSize(int32_t choice);
