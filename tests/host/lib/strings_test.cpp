#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "u_strings.h"
#include "zel_ui.h"

namespace {

TEST(Strings, CacheLooksUpDefaultTextsByIndex) {
    const char* entries[] = {"$$$/QN/Test/LStr/0000=Ostrel 3D", "$$$/QN/Test/LStr/0001=a=b",
                             "no key"};
    U_LStrTable table{entries, 3};
    U_LStrCache cache = nullptr;
    ASSERT_EQ(U_ZRegisterLStrCache(&table, &cache), 0);
    EXPECT_STREQ(U_ZLookupLStrCache(cache, 0, 0, 0), "Ostrel 3D");
    EXPECT_STREQ(U_ZLookupLStrCache(cache, 1, 0, 0), "a=b");
    EXPECT_STREQ(U_ZLookupLStrCache(cache, 2, 0, 0), "no key");
    EXPECT_STREQ(U_ZLookupLStrCache(cache, 3, 0, 0), "");
    EXPECT_EQ(U_ZUnregisterLStrCache(cache), 0);
    EXPECT_STREQ(U_ZLookupLStrCache(cache, 0, 0, 0), "");
    EXPECT_EQ(U_ZUnregisterLStrCache(cache), kU_ErrUnknownCache);
    EXPECT_EQ(U_ZStringToMBString("a=b=c"), "b=c");
    EXPECT_EQ(U_ZStringToMBString("plain"), "plain");
}

TEST(Strings, SubStringFillsPlaceholdersWithinTheBuffer) {
    struct Case {
        size_t capacity;
        const char* format;
        const char* expected;
    };
    const Case cases[] = {
        {10, "^1: ^2", "Ostrel 3D"},
        {1, "^1", ""},
        {1000, "^^1 ^3", "^1 ^3"},
    };
    for (const Case& c : cases) {
        std::vector<char> buffer(c.capacity + 8, 'X');
        U_SubString(buffer.data(), c.capacity, c.format, "Ostrel 3D",
                    "Could not acquire TOMA suite.");
        EXPECT_STREQ(buffer.data(), c.expected);
        EXPECT_EQ(buffer[c.capacity], 'X') << "wrote past the buffer";
    }
}

// Without a presenter a note prints its title, then its text with line breaks.
TEST(NoteBox, PrintedWithoutAPresenter) {
    namespace box = zelui::dialogs::messagebox;
    testing::internal::CaptureStdout();
    box::ShowNote(nullptr, u"Ostrel 3D", u"First line#{cr}Zweite Zeile \u00e4", nullptr);
    EXPECT_EQ(testing::internal::GetCapturedStdout(),
              "Ostrel 3D\nFirst line\nZweite Zeile \xc3\xa4\n");
}

}  // namespace
