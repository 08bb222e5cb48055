#include "renderer/scene/messages.h"

#include <cstring>

#include "m_matrix.h"
#include "u_report.h"

namespace {

constexpr const char* kEntries[] = {
    "$$$/QN/SY/LStr/0000=Tessary 3D",
    "$$$/QN/SY/LStr/0001=Layer and camera geometry subsamples do not match.",
    "$$$/QN/SY/LStr/0002=Different number of world->eye and eye->screen matrices.",
    "$$$/QN/SY/LStr/0003=Cannot render because camera#{rsquo}s parent has a zero scale.",
    "$$$/QN/SY/LStr/0004=Camera projection matrix does not match camera type.",
    "$$$/QN/SY/LStr/0005=object or shadow fragment array",
    "$$$/QN/SY/LStr/0006=object or shadow fragments",
    "$$$/QN/SY/LStr/0007=shadow map",
    "$$$/QN/SY/LStr/0008=shadow map vertices",
};

constexpr U_LStrTable kTable{kEntries, static_cast<int32_t>(sizeof kEntries / sizeof *kEntries)};

// Registered once by the plug-in's entry; read by any thread afterwards.
U_LStrCache gCache = nullptr;

constexpr int32_t kMessageBufferSize = 1000;

}  // namespace

const U_LStrTable* SY_StringTable() {
    return &kTable;
}

int32_t SY_RegisterStrings() {
    if (gCache) return 0;
    return U_ZRegisterLStrCache(&kTable, &gCache);
}

int32_t SY_UnregisterStrings() {
    if (!gCache) return 0;
    int32_t error = U_ZUnregisterLStrCache(gCache);
    gCache = nullptr;
    return error;
}

const char* SY_LookupString(SY_Message message) {
    auto index = static_cast<int32_t>(message);
    if (gCache) return U_ZLookupLStrCache(gCache, index, 0, 0);
    const char* entry = kEntries[index];
    return std::strchr(entry, '=') + 1;
}

void SY_ReportAndThrow(SY_Message message, int32_t reportCode, int32_t errorCode) {
    char buffer[kMessageBufferSize];
    U_SubString(buffer, sizeof buffer, "^1: ^2", SY_LookupString(SY_Message::kName),
                SY_LookupString(message));
    Up_ReportErrString(reportCode, 8, buffer);
    throw errorCode;
}

void SY_ThrowZeroLengthVector() {
    Mp_ReportErr(kM_ErrZeroLengthVector);
    throw kM_ErrZeroLengthVector;
}
