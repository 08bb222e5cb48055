#include <gtest/gtest.h>

#include <cmath>
#include <string>
#include <vector>

#include "lighting_fixtures.h"
#include "m_matrix.h"
#include "renderer/scene/specular_table.h"
#include "u_memory.h"
#include "u_report.h"

namespace {

using namespace lighting_test;

void ExpectTriple(const float actual[3], float r, float g, float b, const char* what) {
    EXPECT_NEAR(actual[0], r, 1e-6) << what;
    EXPECT_NEAR(actual[1], g, 1e-6) << what;
    EXPECT_NEAR(actual[2], b, 1e-6) << what;
}

TEST(Lighting, AmbientOnly) {
    SY_LightState ambient = Ambient(1, 0.5, 0.25);
    auto shader = LitShader({&ambient});
    shader->material.ambient = 0.8;
    shader->material.diffuse = 1;
    SY_Lighting out = LightAt(*shader, 10, 20, 0);
    ExpectTriple(out.diffuse, 0.8f, 0.4f, 0.2f, "colour × ambient");
    ExpectTriple(out.specular, 0, 0, 0, "no highlight");
    shader->material.ambient = 0;
    out = LightAt(*shader, 10, 20, 0);
    ExpectTriple(out.diffuse, 0, 0, 0, "ambient coefficient 0");
}

TEST(Lighting, FacingAndTransmission) {
    // A point light 100 away, in front of, in the plane of, and behind the layer point (0, 0, 0).
    struct Case {
        double z;
        double transmission;
        float diffuse;
    };
    const Case cases[] = {
        {-100, 0, 0.5f},    // in front: colour × diffuse × N·L
        {-100, 0.5, 0.5f},  // transmission does not touch the front
        {0, 0, 0},          // in the plane: behind, and without transmission skipped
        {0, 1, 0},          // in the plane with transmission: N·L = 0 gives nothing
        {100, 0, 0},        // behind without transmission
        {100, 0.5, 0.25f},  // behind: k × transmission × diffuse × |N·L|
    };
    for (const Case& c : cases) {
        SY_LightState light = Point(c.z == 0 ? 100 : 0, 0, c.z);
        auto shader = LitShader({&light});
        shader->material.diffuse = 0.5;
        shader->material.lightTransmission = c.transmission;
        SY_Lighting out = LightAt(*shader, 0, 0, 0);
        std::string what = "z " + std::to_string(c.z) + " t " + std::to_string(c.transmission);
        ExpectTriple(out.diffuse, c.diffuse, c.diffuse, c.diffuse, what.c_str());
    }
}

TEST(Lighting, SpotCone) {
    // A spot 300 in front of the origin aimed at it. The point on the axis has cosine exactly 1;
    // the point (400, 0, 0) sees the light at cosine 0.6 and N·L = 0.6.
    struct Case {
        double x;
        float cosOuter, cosInner;
        float diffuse;
    };
    const Case cases[] = {
        {0, 1.0f, 1.0f, 0},        // exactly on the outer cone: spot 0, not skipped
        {0, 0.5f, 1.0f, 1},        // exactly on the inner cone: spot 1
        {0, 0.5f, 0.9f, 1},        // inside the inner cone
        {400, 0.5f, 0.7f, 0.3f},   // half way: t = 0.5, smoothstep 0.5, × N·L 0.6
        {400, 0.7f, 0.8f, 0},      // outside the outer cone
        {400, 0.4f, 0.55f, 0.6f},  // inside the inner cone, × N·L
    };
    for (const Case& c : cases) {
        SY_LightState spot = Spot(0, 0, -300, 0, 0, -1, c.cosOuter, c.cosInner);
        auto shader = LitShader({&spot});
        shader->material.diffuse = 1;
        SY_Lighting out = LightAt(*shader, c.x, 0, 0);
        EXPECT_NEAR(out.diffuse[0], c.diffuse, 1e-6) << c.x << " " << c.cosOuter;
    }
}

TEST(Lighting, DistanceFalloff) {
    // A point light straight in front at distance d, radius 100: N·L = 1, so D = falloff.
    struct Case {
        int32_t type;
        double distance;  // width of the smooth zone
        double d;
        float falloff;
    };
    const Case cases[] = {
        {0, 0, 5000, 1},          // none
        {2, 0, 50, 1},            // inverse square: full inside the radius
        {2, 0, 100, 1},           // (R/d)² = 1 at the radius
        {2, 0, 200, 0.25f},       // a quarter at twice the radius
        {1, 100, 50, 1},          // smooth: full inside the radius
        {1, 100, 150, 0.5f},      // half way through the zone: smoothstep 0.5
        {1, 100, 175, 0.15625f},  // u = 0.25: 0.0625 × 2.5
        {1, 100, 200, 0},         // the zone's end
        {1, 100, 300, 0},         // beyond it
        {1, 0, 150, 0},           // a zone of no width ends at the radius
    };
    for (const Case& c : cases) {
        SY_LightState light = Point(0, 0, -c.d);
        SetFalloff(&light, c.type, 100, c.distance);
        auto shader = LitShader({&light});
        shader->material.diffuse = 1;
        SY_Lighting out = LightAt(*shader, 0, 0, 0);
        EXPECT_NEAR(out.diffuse[1], c.falloff, 1e-6) << c.type << " at " << c.d;
    }
}

TEST(Lighting, MetalDecidesTheHighlightColor) {
    // A parallel light from the eye's direction: the half vector is the normal, q = 1, and the
    // highlight is colour × specular. A red texel (1, 0, 0) shows texel × D + S.
    SY_SpecularTables tables;
    SY_LightState light = Parallel(0, 0, -1);
    light.color[1] = 1, light.color[2] = 0.8, light.color[3] = 0.6;
    struct Case {
        double metal;
        float red, green, blue;
    };
    const Case cases[] = {
        {1, 1, 0, 0},            // the highlight takes the texture's red
        {0, 1, 0.8f, 0.6f},      // the highlight in the light's colour
        {0.25, 1, 0.6f, 0.45f},  // a quarter through the texture, the rest added
    };
    for (const Case& c : cases) {
        auto shader = LitShader({&light});
        shader->material.specular = 1;
        shader->material.metal = c.metal;
        shader->specularTable = &tables.ForShininess(50);
        SY_Lighting out = LightAt(*shader, 0, 0, 0);
        const float texel[3] = {1, 0, 0};
        float shown[3];
        for (int k = 0; k < 3; ++k)
            shown[k] = texel[k] * out.diffuse[k] + out.specular[k];
        ExpectTriple(shown, c.red, c.green, c.blue, std::to_string(c.metal).c_str());
    }
}

TEST(Lighting, GrazingLightFadesTheHighlight) {
    // A light 0.005 above the plane (N·L = 0.005): the highlight is scaled by 100 × 0.005.
    SY_SpecularTables tables;
    double s = 0.005, c = std::sqrt(1 - s * s);
    SY_LightState light = Parallel(c, 0, -s);
    auto shader = LitShader({&light});
    shader->material.specular = 1;
    shader->material.metal = 0;
    shader->specularTable = &tables.ForShininess(0);  // cos¹ of the half-vector angle
    SY_Lighting out = LightAt(*shader, 0, 0, 0);
    // V = (0, 0, -1): q = (N·H)² / |H|² = (1 + s)² / ((c)² + (1 + s)²) = (1 + s) / 2.
    double q = (1 + s) / 2;
    EXPECT_NEAR(out.specular[0], 0.5 * std::sqrt(std::floor(q * 2048) / 2048), 1e-6);
}

TEST(Lighting, ShadowOnlyLayerWithoutLightsPassesItsTexture) {
    SY_LayerShader shader;  // takes no light and has none
    SY_Lighting out = LightAt(shader, 3, 4, 0);
    ExpectTriple(out.diffuse, 1, 1, 1, "diffuse");
    ExpectTriple(out.specular, 0, 0, 0, "specular");
}

TEST(Lighting, ShadowOnlyLayerIsDarkenedByShadows) {
    struct Case {
        double darkness;
        float t;
        float diffuse;
    };
    const Case cases[] = {
        {1, 0.25f, 0.25f},   // darkness 1: the transmission itself
        {0.5, 0, 0.5f},      // a full shadow at half darkness lets half through
        {0.5, 0.5f, 0.75f},  // 1 - (1 - 0.5) × 0.5
        {0, 0, 1},           // no darkness: the light is left out
    };
    for (const Case& c : cases) {
        SY_LightState light = Point(0, 0, -100);
        light.shadowDarkness = c.darkness;
        light.shadowMap = std::make_unique<FixedShadow>(c.t, c.t, 1);
        SY_LightState lightWithoutMap = Point(0, 0, -100);
        auto shader = LitShader({&light, &lightWithoutMap});
        shader->material.acceptsLights = 0;
        shader->material.acceptsShadows = 2;
        SY_Lighting out = LightAt(*shader, 0, 0, 0);
        ExpectTriple(out.diffuse, c.diffuse, c.diffuse, 1, std::to_string(c.darkness).c_str());
        ExpectTriple(out.specular, 0, 0, 0, "no highlight");
    }
}

TEST(Lighting, ShadowsAttenuateLitLight) {
    struct Case {
        double darkness;
        float t;
        uint8_t soft;
        float diffuse;
    };
    const Case cases[] = {
        {0.5, 0, 0, 0.5f},  // a full shadow at half darkness lets half of the light through
        {1, 0, 0, 0},       // at full darkness the light is skipped
        {1, 0.25f, 1, 0.25f},
    };
    for (const Case& c : cases) {
        SY_LightState light = Parallel(0, 0, -1);
        light.shadowDarkness = c.darkness;
        auto map = std::make_unique<FixedShadow>(c.t, c.t, c.t);
        const FixedShadow& lookups = *map;
        light.shadowMap = std::move(map);
        auto shader = LitShader({&light});
        shader->material.diffuse = 1;
        shader->material.acceptsShadows = 1;
        shader->softShadowLookup = c.soft;
        shader->layerId = 7;
        SY_Lighting out = LightAt(*shader, 0, 0, 0);
        EXPECT_NEAR(out.diffuse[0], c.diffuse, 1e-6) << c.darkness << " " << c.t;
        EXPECT_EQ(lookups.softLookups, c.soft ? 1 : 0);
        EXPECT_EQ(lookups.hardLookups, c.soft ? 0 : 1);
        EXPECT_EQ(lookups.lastReceiver, 7);
        shader->material.acceptsShadows = 0;  // a layer that takes no shadows is never looked up
        out = LightAt(*shader, 0, 0, 0);
        EXPECT_NEAR(out.diffuse[0], 1, 1e-6);
        EXPECT_EQ(lookups.hardLookups + lookups.softLookups, 1);
    }
}

TEST(Lighting, BackFacingLayerIsLitLikeItsFront) {
    // The same layer seen from the front and from behind, with the lights mirrored through its
    // plane. Upstream the normal is turned toward the camera, so the back is lit as the front.
    SY_SpecularTables tables;
    auto lit = [&](double side, const double p[3]) {
        SY_LightState spot = Spot(30, -20, side * 200, -0.1, 0.1, side * 0.99, 0.8f, 0.95f);
        SY_LightState point = Point(-50, 10, side * 80);
        SetFalloff(&point, 2, 60, 0);
        auto shader = LitShader({&spot, &point});
        shader->eye[2] = side * 1000;
        shader->material.diffuse = 0.7;
        shader->material.specular = 0.6;
        shader->material.metal = 0.3;
        shader->specularTable = &tables.ForShininess(40);
        const double n[3] = {0, 0, side};
        SY_Lighting out{};
        shader->LightOnePixel(p, n, &out);
        return out;
    };
    const double p[3] = {12, 7, 0};
    SY_Lighting front = lit(-1, p), back = lit(1, p);
    for (int c = 0; c < 3; ++c) {
        EXPECT_GT(front.diffuse[c], 0);
        EXPECT_GT(front.specular[c], 0);
        EXPECT_EQ(front.diffuse[c], back.diffuse[c]);
        EXPECT_EQ(front.specular[c], back.specular[c]);
    }
}

struct Reports {
    static std::vector<U_Report>& All() {
        static std::vector<U_Report> all;
        return all;
    }
    static void Collect(const U_Report& report) { All().push_back(report); }
};

TEST(Lighting, EyeOnTheSurfaceIsReportedAndThrown) {
    SY_LightState light = Point(0, 0, -100);
    auto shader = LitShader({&light});
    shader->material.diffuse = 1;
    shader->eye[2] = 0;
    Reports::All().clear();
    U_Reporter previous = U_SetReporter(&Reports::Collect);
    int32_t thrown = 0;
    try {
        LightAt(*shader, 0, 0, 0);
    } catch (int32_t code) {
        thrown = code;
    }
    U_SetReporter(previous);
    EXPECT_EQ(thrown, 0x110B);
    ASSERT_EQ(Reports::All().size(), 1u);
    EXPECT_EQ(Reports::All()[0].code, 1114164);
    EXPECT_EQ(Reports::All()[0].severity, 8);
    EXPECT_STREQ(Reports::All()[0].text, M_ErrorMessage(kM_ErrZeroLengthVector));
}

TEST(Lighting, LightOnTheSurfaceIsSkippedSilently) {
    SY_LightState ambient = Ambient(0.2, 0.2, 0.2);
    SY_LightState onSurface = Point(5, 5, 0);
    auto shader = LitShader({&ambient, &onSurface});
    shader->material.ambient = 1;
    shader->material.diffuse = 1;
    Reports::All().clear();
    U_Reporter previous = U_SetReporter(&Reports::Collect);
    SY_Lighting out = LightAt(*shader, 5, 5, 0);
    U_SetReporter(previous);
    EXPECT_TRUE(Reports::All().empty());
    ExpectTriple(out.diffuse, 0.2f, 0.2f, 0.2f, "ambient only");
}

}  // namespace
