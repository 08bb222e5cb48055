// The host utility library's localised-string caches and string formatting.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

// A table of localised strings: every entry is "key=default text", looked up by index.
struct U_LStrTable {
    const char* const* entries;
    int32_t count;
};

// A registered table's handle.
using U_LStrCache = const struct U_LStrCacheRecord*;

// Registers a table; *cache receives the handle. 0 or an error code.
int32_t U_ZRegisterLStrCache(const U_LStrTable* table, U_LStrCache* cache);

// The text of entry index: the part after the first '=' (the whole entry when there is
// none); "" for an unknown cache or index. The two trailing arguments are reserved, 0.
const char* U_ZLookupLStrCache(U_LStrCache cache, int32_t index, int32_t reserved1,
                               int32_t reserved2);

// Drops a cache; 0, or an error code for a cache that is not registered.
int32_t U_ZUnregisterLStrCache(U_LStrCache cache);

// Copies format into buffer (capacity bytes, always terminated, never overrun) with ^1 and
// ^2 replaced by first and second; ^^ stands for ^.
void U_SubString(char* buffer, size_t capacity, const char* format, const char* first,
                 const char* second);

// UTF-8 text as UTF-16, for the UI framework.
std::u16string U_MBToUTF16String(const char* text);

// The localised text of a "key=default text" string: the part after the first '=' (the whole
// string when there is none).
std::string U_ZStringToMBString(const char* zstring);

// The localised text of a "key=default text" string as UTF-16, for the UI framework.
std::u16string U_ZStringToUTF16String(const char* zstring);

// UTF-16 text from the UI framework as UTF-8.
std::string U_UTF16ToMBString(const std::u16string& text);

// The string caches' error code: a cache that is not registered.
inline constexpr int32_t kU_ErrUnknownCache = 0x13A80010;
