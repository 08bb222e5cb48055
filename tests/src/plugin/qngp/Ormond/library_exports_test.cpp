// The built library as the host sees it: one exported function and nothing else.
#include <dlfcn.h>
#include <elf.h>
#include <gtest/gtest.h>

#include <cstring>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include "qngp_suites.h"

namespace {

// Names of the symbols the library's dynamic symbol table defines.
std::vector<std::string> DefinedDynamicSymbols(const char* path) {
    std::ifstream file(path, std::ios::binary);
    std::vector<char> image((std::istreambuf_iterator<char>(file)),
                            std::istreambuf_iterator<char>());
    std::vector<std::string> names;
    if (image.size() < sizeof(Elf64_Ehdr)) return names;
    Elf64_Ehdr header;
    std::memcpy(&header, image.data(), sizeof header);
    auto section = [&](size_t index) {
        Elf64_Shdr s;
        std::memcpy(&s, image.data() + header.e_shoff + index * header.e_shentsize, sizeof s);
        return s;
    };
    for (size_t i = 0; i < header.e_shnum; ++i) {
        Elf64_Shdr symbols = section(i);
        if (symbols.sh_type != SHT_DYNSYM) continue;
        Elf64_Shdr strings = section(symbols.sh_link);
        for (size_t offset = 0; offset + sizeof(Elf64_Sym) <= symbols.sh_size;
             offset += sizeof(Elf64_Sym)) {
            Elf64_Sym symbol;
            std::memcpy(&symbol, image.data() + symbols.sh_offset + offset, sizeof symbol);
            if (symbol.st_shndx == SHN_UNDEF || symbol.st_name == 0) continue;
            names.emplace_back(image.data() + strings.sh_offset + symbol.st_name);
        }
    }
    return names;
}

TEST(LibraryExports, OnlyTheEntryIsDefined) {
    EXPECT_EQ(DefinedDynamicSymbols(ORMOND_LIBRARY), std::vector<std::string>{"GPMain_Ormond"});
}

// The host's side of registration, as far as loading needs it.
std::string gMatchName;
QNGP_DeathHook gDeathHook = nullptr;
constexpr QNGP_RegisterSuite6 kRegisterSuite{
    [](QNGP_Version16, QNGP_Version16, int32_t, int64_t, const char* matchName, const char*,
       const QNGP_ArtisanEntryPoints*) {
        gMatchName = matchName;
        return int32_t{0};
    },
    [](int32_t, QNGP_DeathHook hook, int64_t) {
        gDeathHook = hook;
        return int32_t{0};
    },
};
constexpr QNGP_BasicSuite kBasic{
    [](const char* name, int32_t version, const void** suite) {
        bool served = std::string(name) == kQNGP_RegisterSuite && version == 6;
        *suite = served ? &kRegisterSuite : nullptr;
        return served ? int32_t{0} : kQNGP_ErrMissingSuite;
    },
    [](const char*, int32_t) { return int32_t{0}; },
};

TEST(LibraryExports, HostLoadsTheLibraryAndCallsTheEntryByName) {
    void* library = dlopen(ORMOND_LIBRARY, RTLD_NOW | RTLD_LOCAL);
    ASSERT_NE(library, nullptr) << dlerror();
    EXPECT_EQ(dlsym(library, "_Z8ORM_MainPK15QNGP_BasicSuiteiiiPl"), nullptr);
    auto entry = reinterpret_cast<QNGP_PluginMain>(dlsym(library, "GPMain_Ormond"));
    ASSERT_NE(entry, nullptr);
    int64_t global = 0;
    EXPECT_EQ(entry(&kBasic, 1, 0, 12, &global), 0);
    EXPECT_EQ(global, 12);
    EXPECT_EQ(gMatchName, "VLMR Ormond");
    ASSERT_NE(gDeathHook, nullptr);
    EXPECT_EQ(gDeathHook(12, 0), 0);
    dlclose(library);
}

}  // namespace
