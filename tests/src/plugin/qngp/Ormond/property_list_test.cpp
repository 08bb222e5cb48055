#include "resources/property_list.h"

#include <gtest/gtest.h>

#include <fstream>
#include <iterator>
#include <string>
#include <vector>

namespace {

// Little-endian integers; four-character codes reversed ("4KVR" is stored "RVK4").
std::vector<uint8_t> ExpectedBytes() {
    std::vector<uint8_t> bytes;
    auto add = [&](std::initializer_list<uint8_t> values) {
        bytes.insert(bytes.end(), values.begin(), values.end());
    };
    auto text = [&](const std::string& s) { bytes.insert(bytes.end(), s.begin(), s.end()); };
    add({1, 0, 0, 0, 0, 0, 6, 0, 0, 0});  // word 1, version 0, six properties

    text("RVK4dnik");
    add({0, 0, 0, 0, 4, 0, 0, 0});
    text("xgNQ");

    text("RVK4eman");
    add({0, 0, 0, 0, 40, 0, 0, 0, 37});  // 1 + 37 bytes padded to 40
    text("$$$/QN/QNGP/Name/Tessary3D=Tessary 3D");
    add({0, 0});

    text("RVK4gtac");
    add({0, 0, 0, 0, 8, 0, 0, 0, 7});
    text("Ignored");

    text("RVK4srev");
    add({0, 0, 0, 0, 4, 0, 0, 0, 0x00, 0x00, 0x01, 0x00});

    text("RVK44668");
    add({0, 0, 0, 0, 16, 0, 0, 0});
    text("GPMain_Ormond");
    add({0, 0, 0});

    text("RVK4LFnq");
    add({0, 0, 0, 0, 4, 0, 0, 0, 0x10, 0, 0, 0});
    return bytes;
}

TEST(PropertyList, BytesAreLaidOutForTheHost) {
    std::vector<uint8_t> bytes = ORM_PropertyListBytes();
    EXPECT_EQ(bytes.size(), 182u);
    EXPECT_EQ(bytes, ExpectedBytes());
}

TEST(PropertyList, FileBesideTheLibraryHoldsTheBytes) {
    std::ifstream file(ORMOND_PROPERTY_LIST, std::ios::binary);
    ASSERT_TRUE(file) << ORMOND_PROPERTY_LIST;
    std::vector<uint8_t> bytes((std::istreambuf_iterator<char>(file)),
                               std::istreambuf_iterator<char>());
    EXPECT_EQ(bytes, ExpectedBytes());
}

}  // namespace
