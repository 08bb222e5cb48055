// Text resources of the library, looked up by name as the host's resource files are.
#pragma once

#include <string_view>

// The options dialog's layout script.
inline constexpr char kORM_OptionsDialogScript[] = "OPTIONS_DIALOG_SCRIPT";

// The bytes of the text resource with the name, unchanged; empty for a name it does not have.
std::string_view ORM_TextResource(std::string_view name);
