// The built library exports its entry and nothing else that could clash with the host's.
#include <dlfcn.h>
#include <gtest/gtest.h>

namespace {

TEST(LibraryExports, OnlyTheEntryIsVisible) {
    void* library = dlopen(ORMOND_LIBRARY, RTLD_NOW | RTLD_LOCAL);
    ASSERT_NE(library, nullptr) << dlerror();
    EXPECT_NE(dlsym(library, "GPMain_Ormond"), nullptr);
    // The plug-in's own entry and a renderer function, both defined inside it.
    for (const char* hidden : {"_Z8ORM_MainPK15QNGP_BasicSuiteiiiPl", "_Z18SY_RegisterStringsv"})
        EXPECT_EQ(dlsym(library, hidden), nullptr) << hidden;
    dlclose(library);
}

}  // namespace
