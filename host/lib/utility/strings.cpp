#include "u_strings.h"

#include <cstring>
#include <list>
#include <mutex>
#include <string>
#include <vector>

struct U_LStrCacheRecord {
    std::vector<std::string> texts;
};

namespace {

std::mutex gCachesMutex;
// A list keeps each record's address stable while others come and go.
std::list<U_LStrCacheRecord> gCaches;

std::string DefaultText(const char* entry) {
    const char* equals = std::strchr(entry, '=');
    return equals ? std::string(equals + 1) : std::string(entry);
}

}  // namespace

int32_t U_ZRegisterLStrCache(const U_LStrTable* table, U_LStrCache* cache) {
    if (!table || !cache || table->count < 0) return kU_ErrUnknownCache;
    U_LStrCacheRecord record;
    record.texts.reserve(static_cast<size_t>(table->count));
    for (int32_t i = 0; i < table->count; ++i) {
        record.texts.push_back(table->entries[i] ? DefaultText(table->entries[i]) : std::string());
    }
    std::lock_guard lock(gCachesMutex);
    *cache = &gCaches.emplace_back(std::move(record));
    return 0;
}

const char* U_ZLookupLStrCache(U_LStrCache cache, int32_t index, int32_t, int32_t) {
    std::lock_guard lock(gCachesMutex);
    for (const auto& record : gCaches) {
        if (&record == cache) {
            if (index < 0 || static_cast<size_t>(index) >= record.texts.size()) return "";
            return record.texts[static_cast<size_t>(index)].c_str();
        }
    }
    return "";
}

int32_t U_ZUnregisterLStrCache(U_LStrCache cache) {
    std::lock_guard lock(gCachesMutex);
    for (auto it = gCaches.begin(); it != gCaches.end(); ++it) {
        if (&*it == cache) {
            gCaches.erase(it);
            return 0;
        }
    }
    return kU_ErrUnknownCache;
}

void U_SubString(char* buffer, size_t capacity, const char* format, const char* first,
                 const char* second) {
    if (!buffer || capacity == 0) return;
    size_t used = 0;
    auto append = [&](const char* text, size_t length) {
        size_t room = capacity - 1 - used;
        size_t n = length < room ? length : room;
        std::memcpy(buffer + used, text, n);
        used += n;
    };
    for (const char* p = format ? format : ""; *p; ++p) {
        if (p[0] == '^' && (p[1] == '1' || p[1] == '2')) {
            const char* argument = p[1] == '1' ? first : second;
            if (argument) append(argument, std::strlen(argument));
            ++p;
        } else if (p[0] == '^' && p[1] == '^') {
            append(p, 1);
            ++p;
        } else {
            append(p, 1);
        }
    }
    buffer[used] = '\0';
}

std::string U_ZStringToMBString(const char* zstring) {
    return DefaultText(zstring ? zstring : "");
}

std::u16string U_MBToUTF16String(const char* text) {
    // Multibyte strings are UTF-8 here.
    std::u16string out;
    const auto* p = reinterpret_cast<const unsigned char*>(text ? text : "");
    while (*p) {
        char32_t c = *p;
        int extra = c >= 0xF0 ? 3 : c >= 0xE0 ? 2 : c >= 0xC0 ? 1 : 0;
        c &= extra == 3 ? 0x07 : extra == 2 ? 0x0F : extra == 1 ? 0x1F : 0x7F;
        ++p;
        for (int i = 0; i < extra && (*p & 0xC0) == 0x80; ++i, ++p)
            c = (c << 6) | (*p & 0x3F);
        if (c >= 0x10000) {
            c -= 0x10000;
            out.push_back(static_cast<char16_t>(0xD800 + (c >> 10)));
            out.push_back(static_cast<char16_t>(0xDC00 + (c & 0x3FF)));
        } else {
            out.push_back(static_cast<char16_t>(c));
        }
    }
    return out;
}

std::string U_UTF16ToMBString(const std::u16string& text) {
    // Multibyte strings are UTF-8 here.
    std::string out;
    for (size_t i = 0; i < text.size(); ++i) {
        char32_t c = text[i];
        if (c >= 0xD800 && c < 0xDC00 && i + 1 < text.size()) {
            c = 0x10000 + ((c - 0xD800) << 10) + (text[++i] - 0xDC00);
        }
        if (c < 0x80) {
            out.push_back(static_cast<char>(c));
        } else if (c < 0x800) {
            out.push_back(static_cast<char>(0xC0 | (c >> 6)));
            out.push_back(static_cast<char>(0x80 | (c & 0x3F)));
        } else if (c < 0x10000) {
            out.push_back(static_cast<char>(0xE0 | (c >> 12)));
            out.push_back(static_cast<char>(0x80 | ((c >> 6) & 0x3F)));
            out.push_back(static_cast<char>(0x80 | (c & 0x3F)));
        } else {
            out.push_back(static_cast<char>(0xF0 | (c >> 18)));
            out.push_back(static_cast<char>(0x80 | ((c >> 12) & 0x3F)));
            out.push_back(static_cast<char>(0x80 | ((c >> 6) & 0x3F)));
            out.push_back(static_cast<char>(0x80 | (c & 0x3F)));
        }
    }
    return out;
}

std::u16string U_ZStringToUTF16String(const char* zstring) {
    return U_MBToUTF16String(U_ZStringToMBString(zstring).c_str());
}
