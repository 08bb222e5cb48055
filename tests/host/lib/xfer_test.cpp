#include <gtest/gtest.h>

#include <sstream>
#include <string>

#include "host/lib/pixel_test_support.h"
#include "pf_xfer.h"

namespace {

using pixel_test::Argb;
using pixel_test::Channels;
using pixel_test::ExpectChannels;
using pixel_test::FromUnit;
using pixel_test::Step;

template <class P>
P Blend(int32_t mode, const Argb& src, const Argb& dst) {
    P s = FromUnit<P>(src), d = FromUnit<P>(dst);
    PF_Get_Xfer1<P>(mode)(&s, nullptr, &d);
    return d;
}

template <class P>
class XferModes : public ::testing::Test {};
using PixelTypes = ::testing::Types<PF_Pixel8, PF_Pixel16, PF_PixelFloat>;
TYPED_TEST_SUITE(XferModes, PixelTypes);

// Whatever the mode, a clear source leaves the backdrop exactly as it was.
TYPED_TEST(XferModes, ClearSourceChangesNothing) {
    using P = TypeParam;
    const Argb dst = {0.6f, 0.2f, 0.4f, 0.8f};
    for (int32_t mode = 1; mode < 128; ++mode) {
        ExpectChannels(Blend<P>(mode, {0.0f, 0.9f, 0.5f, 0.1f}, dst), Channels(FromUnit<P>(dst)),
                       0.0, "transparent source, mode " + std::to_string(mode));
    }
}

// Opaque source over opaque backdrop gives the blend formula itself; values picked so that
// the published formulas can be worked by hand.
TYPED_TEST(XferModes, FormulasOfSeparableModes) {
    using P = TypeParam;
    // Mode, backdrop, source, result; three to a line.
    std::istringstream table(R"(
        normal       0.2  0.6  0.6     multiply     0.5  0.5  0.25    screen       0.5  0.5  0.75
        overlay      0.25 0.5  0.25    overlay      0.75 0.5  0.75    hard-light   0.25 0.75 0.625
        soft-light   0.25 0.75 0.375   soft-light   0.64 0.75 0.72    soft-light   0.5  0.25 0.375
        darken       0.3  0.6  0.3     lighten      0.3  0.6  0.6     difference   0.3  0.6  0.3
        color-dodge  0.25 0.5  0.5     color-dodge  0.0  1.0  0.0     color-burn   0.75 0.5  0.5
        color-burn   1.0  0.0  1.0     exclusion    0.5  0.5  0.5     exclusion    0.25 1.0  0.75
        subtract     0.6  0.2  0.4     subtract     0.2  0.6  0.0     divide       0.3  0.6  0.5
        divide       0.6  0.3  1.0     linear-dodge 0.6  0.6  1.0     linear-dodge 0.2  0.3  0.5
        linear-burn  0.6  0.6  0.2     linear-burn  0.2  0.3  0.0     linear-light 0.4  0.6  0.6
        linear-light 0.4  0.1  0.0     vivid-light  0.5  0.75 1.0     vivid-light  0.5  0.25 0.0
        vivid-light  0.8  0.4  0.75    pin-light    0.2  0.8  0.6     pin-light    0.6  0.2  0.4
        hard-mix     0.6  0.5  1.0     hard-mix     0.3  0.5  0.0     add          0.2  0.3  0.5
        add          0.6  0.6  1.0)");
    // Integer depths quantise inputs and result; dodge and burn double the input's error.
    double tolerance = PF_PixelTraits<P>::kIsFloat ? 1e-5 : 2.5 * Step<P>();
    std::string name;
    double cb, cs, want;
    while (table >> name >> cb >> cs >> want) {
        int32_t mode = PF_XferModeFromName(name.c_str());
        ASSERT_GE(mode, 0) << name;
        EXPECT_STREQ(PF_XferModeToName(mode), name.c_str());
        ExpectChannels(Blend<P>(mode, {1, cs, cs, cs}, {1, cb, cb, cb}), {1, want, want, want},
                       tolerance, name + " cb " + std::to_string(cb) + " cs " + std::to_string(cs));
    }
    EXPECT_TRUE(table.eof()) << "the table stops reading at " << name;
}

// Non-separable modes, partly transparent layers and layer opacity: the compositing around the
// blend formula.
TYPED_TEST(XferModes, NonSeparableTranslucentAndFaded) {
    using P = TypeParam;
    struct Case {
        const char* mode;
        float opacity;  // below 1: through the entry that fades the source
        Argb src, dst, want;
    };
    // Backdrop (0.2, 0.4, 0.6): luminosity 0.3·0.2 + 0.59·0.4 + 0.11·0.6 = 0.362, saturation 0.4.
    const Argb backdrop = {1.0f, 0.2f, 0.4f, 0.6f};
    const Case cases[] = {
        {"luminosity", 1, {1, 0.5, 0.5, 0.5}, backdrop, {1, 0.338, 0.538, 0.738}},
        {"saturation", 1, {1, 0.5, 0.5, 0.5}, backdrop, {1, 0.362, 0.362, 0.362}},
        {"color", 1, {1, 0.8, 0.8, 0.8}, backdrop, {1, 0.362, 0.362, 0.362}},
        // Red at saturation 0.4 is (0.4, 0, 0), luminosity 0.12: lifted by 0.242.
        {"hue", 1, {1, 1, 0, 0}, backdrop, {1, 0.642, 0.242, 0.242}},
        {"lighter-color", 1, {1, 0, 1, 0}, {1, 1, 0, 0}, {1, 0, 1, 0}},
        {"darker-color", 1, {1, 0, 1, 0}, {1, 1, 0, 0}, {1, 1, 0, 0}},
        // Half red over opaque blue.
        {"normal", 1, {0.5, 1, 0, 0}, {1, 0, 0, 1}, {1, 0.5, 0, 0.5}},
        // Halves over each other: alpha 0.75, colour (0.5·src + 0.25·dst) / 0.75.
        {"normal", 1, {0.5, 0.9, 0.3, 0}, {0.5, 0.3, 0.9, 0}, {0.75, 0.7, 0.5, 0}},
        // Multiply shows the source where the backdrop is absent: half backdrop alpha.
        {"multiply", 1, {1, 0.5, 0.5, 0.5}, {0.5, 0.5, 0.5, 0.5}, {1, 0.375, 0.375, 0.375}},
        {"behind", 1, {1, 1, 0, 0}, {0.5, 0, 0, 1}, {1, 0.5, 0, 0.5}},
        {"add", 1, {0.5, 1, 0, 0}, {0.5, 0, 0, 1}, {1, 0.5, 0, 0.5}},
        {"copy", 1, {0.5, 1, 0, 0}, {1, 0, 0, 1}, {0.5, 1, 0, 0}},
        {"normal", 0.5, {1, 1, 0, 0}, {1, 0, 0, 1}, {1, 0.5, 0, 0.5}},
        {"normal", 0.0, {1, 1, 0, 0}, {1, 0, 0, 1}, {1, 0, 0, 1}},
        {"multiply", 0.5, {1, 0, 0, 0}, {1, 1, 1, 1}, {1, 0.5, 0.5, 0.5}},
        // Copy replaces the covered share of the pixel.
        {"copy", 0.25, {1, 1, 0, 0}, {1, 0, 0, 1}, {1, 0.25, 0, 0.75}},
        {"copy", 0.0, {0, 1, 0, 0}, {1, 0, 0, 1}, {1, 0, 0, 1}},
    };
    double tolerance = PF_PixelTraits<P>::kIsFloat ? 1e-5 : 1.5 * Step<P>();
    for (const Case& c : cases) {
        SCOPED_TRACE(testing::Message() << c.mode << " at opacity " << c.opacity);
        int32_t mode = PF_XferModeFromName(c.mode);
        if (c.opacity == 1) {
            ExpectChannels(Blend<P>(mode, c.src, c.dst), c.want, tolerance, c.mode);
            continue;
        }
        P s = FromUnit<P>(c.src), d = FromUnit<P>(c.dst);
        auto opacity = static_cast<PF_XferOpacity<P>>(c.opacity * PF_PixelTraits<P>::kMax);
        PF_Get_Xfer1_Opacity<P>(mode)(&s, nullptr, opacity, &d);
        ExpectChannels(d, c.want, tolerance, c.mode);
    }
}

// Names are exact; modes without a blend of their own are normal.
TEST(XferModeNames, UnknownNamesAndModesWithoutABlend) {
    EXPECT_EQ(PF_XferModeFromName("Normal"), -1);
    EXPECT_EQ(PF_XferModeToName(100), nullptr);
    for (int32_t mode : {3, 17, 18, 40, 127, 128 + 2}) {
        ExpectChannels(Blend<PF_Pixel8>(mode, {0.5, 1, 0, 0}, {1, 0, 0, 1}), {1, 0.5, 0, 0.5},
                       1.0 / 255, std::to_string(mode));
    }
}

}  // namespace
