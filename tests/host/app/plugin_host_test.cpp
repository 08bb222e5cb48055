#include <gtest/gtest.h>

#include <dlfcn.h>

#include <filesystem>
#include <string>

#include "host_error.h"
#include "plugins/plugin_host.h"
#include "suites/suite_registry.h"
#include "test_files.h"

namespace ostrel {
namespace {

namespace fs = std::filesystem;

// A property list built byte by byte, as a plug-in's resource holds it.
class PropertyList {
public:
    PropertyList& Kind(const std::string& code) {
        return Property("kind", {code.rbegin(), code.rend()});
    }
    PropertyList& Entry(const std::string& name) {
        std::string value = name;
        value.resize((name.size() + 1 + 15) / 16 * 16, '\0');
        return Property("8664", value);
    }
    std::string Bytes() const {
        std::string bytes{1, 0, 0, 0, 0, 0};
        Append32(&bytes, count_);
        return bytes + body_;
    }

private:
    PropertyList& Property(const std::string& key, const std::string& value) {
        body_ += "RVK4" + std::string(key.rbegin(), key.rend());
        Append32(&body_, 0);
        Append32(&body_, static_cast<uint32_t>(value.size()));
        body_ += value;
        body_.resize((body_.size() + 3) / 4 * 4, '\0');
        ++count_;
        return *this;
    }
    static void Append32(std::string* bytes, uint32_t v) {
        for (int i = 0; i < 4; ++i)
            bytes->push_back(static_cast<char>(v >> (8 * i)));
    }

    std::string body_;
    uint32_t count_ = 0;
};

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
    PluginFolder plugins(PropertyList().Kind("QNgx").Entry("TestArtisanMain").Bytes());
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
    const std::string whole = PropertyList().Kind("QNgx").Entry("TestArtisanMain").Bytes();
    const Case cases[] = {
        {"wrong kind", PropertyList().Kind("QNfl").Entry("TestArtisanMain").Bytes(),
         "not a general plug-in"},
        {"no kind", PropertyList().Entry("TestArtisanMain").Bytes(), "has no kind"},
        {"no entry point", PropertyList().Kind("QNgx").Bytes(), "names no x86-64 entry point"},
        {"truncated", whole.substr(0, 30), "it ends inside"},
        {"missing entry point", PropertyList().Kind("QNgx").Entry("NoSuchMain").Bytes(),
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
