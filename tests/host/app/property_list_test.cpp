#include <gtest/gtest.h>

#include "host_error.h"
#include "plugins/property_list.h"
#include "property_list_builder.h"

namespace {

using ostrel::ParsePropertyList;
using ostrel_test::PropertyListBuilder;

TEST(PropertyList, RejectsWhatAHostCannotUse) {
    struct Case {
        const char* name;
        std::vector<uint8_t> bytes;
        const char* problem;
    };
    PropertyListBuilder noEntry;
    noEntry.Code("kind", "QNgx");
    PropertyListBuilder noKind;
    noKind.Entry("GPMain_Ormond");
    auto whole = PropertyListBuilder::General("GPMain_Ormond").Bytes();
    const Case cases[] = {
        {"missing entry point", noEntry.Bytes(), "names no x86-64 entry point"},
        {"missing kind", noKind.Bytes(), "has no kind"},
        {"truncated", std::vector<uint8_t>(whole.begin(), whole.begin() + 30), "it ends inside"},
        {"empty", {}, "it ends inside the header"},
    };
    for (const Case& c : cases) {
        try {
            ParsePropertyList(c.bytes, "broken.prpl");
            ADD_FAILURE() << c.name << " was accepted";
        } catch (const ostrel::HostError& e) {
            std::string message = e.what();
            EXPECT_NE(message.find("broken.prpl"), std::string::npos) << message;
            EXPECT_NE(message.find(c.problem), std::string::npos) << c.name << ": " << message;
        }
    }
}

}  // namespace
