#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "pf_bit_depth.h"
#include "u_report.h"

namespace {

std::vector<U_Report::Kind> gReported;

void Collect(const U_Report& report) {
    gReported.push_back(report.kind);
}

// Each of 8, 16 and 32 names one pixel type, as every render at each depth shows; any other
// depth is an error, never a guess. The host's own code gets PF_UnexpectedBitDepth with a message
// for the user; plug-in and renderer code gets a failed-verification report and the error code 3.
TEST(BitDepthDispatch, UnknownDepthsThrow) {
    auto chosen = []<class P>() { return int32_t{PF_PixelTraits<P>::kBitDepth}; };
    U_Reporter previous = U_SetReporter(&Collect);
    for (int32_t depth : {0, 1, 24, 64, -8}) {
        SCOPED_TRACE(depth);
        gReported.clear();
        try {
            PF_DispatchBitDepth(depth, chosen);
            ADD_FAILURE() << "no exception";
        } catch (const PF_UnexpectedBitDepth& error) {
            EXPECT_EQ(std::string(error.what()),
                      "a bit depth of " + std::to_string(depth) + " (expected 8, 16 or 32)");
        }
        int32_t thrown = 0;
        try {
            PF_DispatchBitDepth(depth, chosen, U_BitDepthVerification("unexpected depth"));
        } catch (int32_t code) {
            thrown = code;
        }
        EXPECT_EQ(thrown, kU_ErrUnexpectedBitDepth);
        EXPECT_EQ(gReported, std::vector{U_Report::Kind::kFailedVerification});
    }
    U_SetReporter(previous);
}

}  // namespace
