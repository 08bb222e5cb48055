#include <gtest/gtest.h>

#include <dlfcn.h>

#include <filesystem>
#include <fstream>

#include "host_error.h"
#include "plugins/plugin_host.h"
#include "property_list_builder.h"
#include "suites/suite_registry.h"

namespace {

namespace fs = std::filesystem;
using ostrel::PluginHost;
using ostrel_test::PropertyListBuilder;

// A copy of the test plug-in in a folder of its own, with the given property list beside it.
class PluginFolder {
public:
    explicit PluginFolder(const std::vector<uint8_t>& list)
        : folder_(fs::temp_directory_path() / ("ostrel-plugins-" + std::to_string(::getpid()))) {
        fs::create_directories(folder_);
        library_ = folder_ / "libtest_artisan.so";
        fs::copy_file(OSTREL_TEST_ARTISAN, library_, fs::copy_options::overwrite_existing);
        std::ofstream(PluginHost::PropertyListPath(library_), std::ios::binary)
            .write(reinterpret_cast<const char*>(list.data()),
                   static_cast<std::streamsize>(list.size()));
    }
    ~PluginFolder() { fs::remove_all(folder_); }
    const fs::path& folder() const { return folder_; }
    const fs::path& library() const { return library_; }

private:
    fs::path folder_;
    fs::path library_;
};

TEST(PluginHost, LoadsRegistersAndUnloads) {
    PluginFolder plugins(PropertyListBuilder::General("TestArtisanMain").Bytes());
    // Our own reference keeps the library mapped after the host unloads it.
    void* library = dlopen(plugins.library().c_str(), RTLD_NOW);
    ASSERT_NE(library, nullptr);
    int32_t* deaths = reinterpret_cast<int32_t* (*)()>(dlsym(library, "TestArtisanDeaths"))();
    {
        PluginHost host;
        host.LoadFolder(plugins.folder());
        ASSERT_EQ(host.Artisans().size(), 1u);
        const ostrel::Artisan* artisan = host.FindArtisan("TEST Artisan");
        ASSERT_NE(artisan, nullptr);
        EXPECT_EQ(artisan->displayName, "Test Artisan");
        EXPECT_NE(artisan->entries.about, nullptr);
        EXPECT_EQ(artisan->entries.render, nullptr);
        EXPECT_EQ(artisan->entries.about(host.InDataFor(artisan->pluginId)), 0);
        EXPECT_EQ(ostrel::SuiteRegistry::Instance().Outstanding(), 0);
        EXPECT_EQ(*deaths, 0);
    }
    EXPECT_EQ(*deaths, 1);
    dlclose(library);
}

TEST(PluginHost, RefusesWhatItCannotLoad) {
    struct Case {
        const char* name;
        std::vector<uint8_t> list;
        const char* problem;
    };
    PropertyListBuilder filter, noKind, noEntry;
    filter.Code("kind", "QNfl").Entry("TestArtisanMain");
    noKind.Entry("TestArtisanMain");
    noEntry.Code("kind", "QNgx");
    auto whole = PropertyListBuilder::General("TestArtisanMain").Bytes();
    const Case cases[] = {
        {"wrong kind", filter.Bytes(), "not a general plug-in"},
        {"no kind", noKind.Bytes(), "has no kind"},
        {"no entry point", noEntry.Bytes(), "names no x86-64 entry point"},
        {"truncated", std::vector<uint8_t>(whole.begin(), whole.begin() + 30), "it ends inside"},
        {"missing entry point", PropertyListBuilder::General("NoSuchMain").Bytes(),
         "\"NoSuchMain\" that its property list names is not exported"},
    };
    for (const Case& c : cases) {
        PluginFolder plugins(c.list);
        PluginHost host;
        try {
            host.Load(plugins.library());
            ADD_FAILURE() << c.name << " loaded";
        } catch (const ostrel::HostError& e) {
            std::string message = e.what();
            EXPECT_NE(message.find(c.problem), std::string::npos) << message;
            EXPECT_NE(message.find("libtest_artisan"), std::string::npos) << message;
        }
        EXPECT_TRUE(host.Artisans().empty());
    }
}

}  // namespace
