#include <gtest/gtest.h>

#include <dlfcn.h>

#include <filesystem>
#include <string>
#include <utility>

#include "host_error.h"
#include "plugins/plugin_host.h"
#include "suites/suite_registry.h"
#include "test_files.h"

namespace ostrel {
namespace {

namespace fs = std::filesystem;

std::string Le32(uint32_t v) {
    return {char(v), char(v >> 8), char(v >> 16), char(v >> 24)};
}

// A property, its key and value as a plug-in's property list holds them: the kind's code and
// the key reversed, the entry's name padded to 16 bytes.
using Property = std::pair<std::string, std::string>;
Property Kind(const std::string& code) {
    return {"dnik", {code.rbegin(), code.rend()}};
}
Property Entry(std::string name) {
    name.resize((name.size() + 1 + 15) / 16 * 16, '\0');
    return {"4668", name};
}

// A property list built byte by byte, as a plug-in's resource holds it; each property padded
// to four bytes.
std::string PropertyList(std::initializer_list<Property> properties) {
    std::string body;
    for (const auto& [key, value] : properties) {
        body += "RVK4" + key + Le32(0) + Le32(static_cast<uint32_t>(value.size())) + value;
        body.resize((body.size() + 3) / 4 * 4, '\0');
    }
    return std::string{1, 0, 0, 0, 0, 0} + Le32(static_cast<uint32_t>(properties.size())) + body;
}

// A copy of the test plug-in in a folder of its own, with the given property list beside it.
struct PluginFolder {
    explicit PluginFolder(const std::string& list) {
        fs::copy_file(OSTREL_TEST_ARTISAN, library);
        folder.WriteText(PluginHost::PropertyListPath(library).filename(), list);
    }
    TempFolder folder;
    fs::path library = folder.Path() / "libtest_artisan.so";
};

TEST(PluginHost, LoadsRegistersAndUnloads) {
    PluginFolder plugins(PropertyList({Kind("QNgx"), Entry("TestArtisanMain")}));
    // Our own reference keeps the library mapped after the host unloads it.
    void* library = dlopen(plugins.library.c_str(), RTLD_NOW);
    ASSERT_NE(library, nullptr);
    int32_t* deaths = reinterpret_cast<int32_t* (*)()>(dlsym(library, "TestArtisanDeaths"))();
    {
        PluginHost host;
        host.LoadFolder(plugins.folder.Path());
        ASSERT_EQ(host.Artisans().size(), 1u);
        const Artisan* artisan = host.FindArtisan("TEST Artisan");
        ASSERT_NE(artisan, nullptr);
        EXPECT_EQ(artisan->displayName, "Test Artisan");
        ASSERT_NE(artisan->entries.about, nullptr);
        EXPECT_EQ(artisan->entries.render, nullptr);
        EXPECT_EQ(artisan->entries.about(host.InDataFor(artisan->pluginId)), 0);
        EXPECT_EQ(SuiteRegistry::Instance().Outstanding(), 0);
        EXPECT_EQ(*deaths, 0);
    }
    EXPECT_EQ(*deaths, 1);
    dlclose(library);
}

TEST(PluginHost, RefusesWhatItCannotLoad) {
    struct Case {
        const char* name;
        std::string list;
        const char* problem;
    };
    const std::string whole = PropertyList({Kind("QNgx"), Entry("TestArtisanMain")});
    const Case cases[] = {
        {"wrong kind", PropertyList({Kind("QNfl"), Entry("TestArtisanMain")}),
         "not a general plug-in"},
        {"no kind", PropertyList({Entry("TestArtisanMain")}), "has no kind"},
        {"no entry point", PropertyList({Kind("QNgx")}), "names no x86-64 entry point"},
        {"truncated", whole.substr(0, 30), "it ends inside"},
        {"missing entry point", PropertyList({Kind("QNgx"), Entry("NoSuchMain")}),
         "\"NoSuchMain\" that its property list names is not exported"},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        PluginFolder plugins(c.list);
        PluginHost host;
        try {
            host.Load(plugins.library);
            ADD_FAILURE() << "loaded";
        } catch (const HostError& e) {
            std::string message = e.what();
            EXPECT_NE(message.find(c.problem), std::string::npos) << message;
            EXPECT_NE(message.find("libtest_artisan"), std::string::npos) << message;
        }
        EXPECT_TRUE(host.Artisans().empty());
    }
}

}  // namespace
}  // namespace ostrel
