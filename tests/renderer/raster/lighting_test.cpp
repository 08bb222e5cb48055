#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <cstring>
#include <tuple>
#include <vector>

#include "renderer/raster/shader.h"
#include "renderer/scene/render_context.h"
#include "renderer/scene/renderable.h"
#include "renderer/scene/specular_table.h"
#include "tests/renderer/renderer_test_support.h"
#include "u_memory.h"

namespace {

// The layer lies in the plane z = 0 facing the eye at (0, 0, −1000): its normal is (0, 0, −1).
constexpr double kFront[3] = {0, 0, -1};

// A white light: parallel ones shine from the unit direction (x, y, z) as seen from the lit
// area, point and spot lights sit at (x, y, z), ambient ones ignore it.
SY_LightState Light(int32_t type, double x = 0, double y = 0, double z = 0) {
    SY_LightState light;
    light.type = type;
    std::fill(light.color, light.color + 4, 1.0);
    double* where = type == kSY_LightParallel ? light.direction : light.position;
    where[0] = x, where[1] = y, where[2] = z;
    return light;
}

// A spot at (x, y, z) aimed along the negated unit axis (ax, ay, az).
SY_LightState Spot(double x, double y, double z, double ax, double ay, double az, float cosOuter,
                   float cosInner) {
    SY_LightState light = Light(kSY_LightSpot, x, y, z);
    light.direction[0] = ax, light.direction[1] = ay, light.direction[2] = az;
    light.cosOuter = cosOuter, light.cosInner = cosInner;
    light.coneScale = cosInner == cosOuter ? 0.0f : 1.0f / (cosInner - cosOuter);
    return light;
}

// A light with a falloff of type over radius and distance, and the squares preparing derives.
SY_LightState Falloff(SY_LightState light, int32_t type, double radius, double distance) {
    light.falloffType = type, light.falloffRadius = radius, light.falloffDistance = distance;
    light.radiusSquared = radius * radius, light.distanceSquared = distance * distance;
    light.outerSquared = (radius + distance) * (radius + distance);
    light.inverseDistance = distance == 0 ? 1.0 : 1.0 / distance;
    return light;
}

// A shadow map that lets through a fixed transmission and counts the lookups asked of it.
struct FixedShadow : SY_ShadowMap {
    FixedShadow(float r, float g, float b) : t{r, g, b} {}
    void HardLookup(const double*, uint16_t receiver, float out[4]) const override {
        Fill(receiver, out, &hardLookups);
    }
    void SoftLookup(const double*, uint16_t receiver, float out[4]) const override {
        Fill(receiver, out, &softLookups);
    }
    void Fill(uint16_t receiver, float out[4], int* lookups) const {
        lastReceiver = receiver;
        ++*lookups;
        out[0] = 1;
        std::copy(t, t + 3, out + 1);
    }

    float t[3];
    mutable int hardLookups = 0, softLookups = 0, lastReceiver = -1;
};

// A shader that takes light from `lights`, with no material terms but those the test sets.
std::unique_ptr<SY_LayerShader> LitShader(std::initializer_list<const SY_LightState*> lights) {
    auto shader = std::make_unique<SY_LayerShader>();
    shader->material.acceptsLights = true;
    shader->shaded = shader->needsPoint = 1;
    shader->eye[2] = -1000;
    shader->lights.Allocate(static_cast<int32_t>(lights.size()));
    std::copy(lights.begin(), lights.end(), shader->lights.begin());
    return shader;
}

// The lighting of the layer point (x, y, 0) under normal n. The point is lit alone and paired
// with another 150 to the right and 40 up, which lights differently; a pair must light bit for
// bit as its two pixels alone.
SY_Lighting LightAt(const SY_LayerShader& shader, double x, double y, const double n[3] = kFront) {
    const double p[3] = {x, y, 0}, q[3] = {x + 150, y - 40, 0};
    SY_Lighting alone[2], paired[2];
    shader.LightOnePixel(p, n, &alone[0]);
    shader.LightOnePixel(q, n, &alone[1]);
    shader.LightTwoPixels(p, q, n, &paired[0], &paired[1]);
    EXPECT_EQ(std::memcmp(alone, paired, sizeof alone), 0) << "pair at " << x << ", " << y;
    return alone[0];
}

// Where the processor has four lanes: the point (x, 0, 0) and three others that light
// differently, each a ray over its own W, lit at once, light bit for bit as each alone.
void ExpectFourLikeOne(const SY_LayerShader& shader, double x) {
    if (SY_WidestLightingLanes() != SY_LightingLanes::kFour) return;
    const float offsets[4][3] = {{0, 0, 0}, {150, -40, 0}, {-70, 90, 0}, {20, 300, 0}};
    const double invW[4] = {1, 0.5, 2, 0.75};
    SY_FourPoints points;
    for (int i = 0; i < 4; ++i) {
        points.ray[0][i] = static_cast<float>(x) + offsets[i][0];
        points.ray[1][i] = offsets[i][1];
        points.ray[2][i] = offsets[i][2];
        points.invW[i] = invW[i];
    }
    SY_Lighting alone[4], four[4];
    SY_FourLightings lanes;
    for (int i = 0; i < 4; ++i) {
        double point[3];
        points.Point(i, point);
        shader.LightOnePixel(point, kFront, &alone[i]);
    }
    shader.LightFourPixels(points, kFront, &lanes);
    for (int i = 0; i < 4; ++i) {
        four[i] = {{lanes.diffuse[0][i], lanes.diffuse[1][i], lanes.diffuse[2][i]},
                   {lanes.specular[0][i], lanes.specular[1][i], lanes.specular[2][i]}};
    }
    EXPECT_EQ(std::memcmp(alone, four, sizeof alone), 0) << "four at " << x;
}

// One light over the layer point (x, 0, 0) with diffuse 1: the diffuse term is the light's
// colour times `lit`, which a reader gets from N·L, the cone and the falloff.
TEST(Lighting, OneLightAtAKnownPlace) {
    struct Case {
        const char* what;
        SY_LightState light;
        double x, ambient, transmission;
        float lit;
    };
    SY_LightState tinted = Light(kSY_LightAmbient);
    tinted.color[2] = 0.5, tinted.color[3] = 0.25;
    const Case cases[] = {
        {"ambient: colour × coefficient", std::move(tinted), 0, 0.8, 0, 0.8f},
        {"point in front: N·L = 1", Light(kSY_LightPoint, 0, 0, -100), 0, 0, 0.5, 1},
        {"point in the plane: N·L = 0", Light(kSY_LightPoint, 100, 0, 0), 0, 0, 1, 0},
        {"point behind, no transmission", Light(kSY_LightPoint, 0, 0, 100), 0, 0, 0, 0},
        {"point behind: transmission × |N·L|", Light(kSY_LightPoint, 0, 0, 100), 0, 0, 0.5, 0.5f},
        // A spot 300 in front aimed at the origin: cosine 1 on the axis; the point (400, 0, 0)
        // sees it at cosine 0.6 with N·L = 0.6.
        {"on the outer cone: 0", Spot(0, 0, -300, 0, 0, -1, 1, 1), 0, 0, 0, 0},
        {"on the inner cone: 1", Spot(0, 0, -300, 0, 0, -1, 0.5f, 1), 0, 0, 0, 1},
        {"halfway: smoothstep ½ × N·L", Spot(0, 0, -300, 0, 0, -1, 0.5f, 0.7f), 400, 0, 0, 0.3f},
        {"outside the outer cone", Spot(0, 0, -300, 0, 0, -1, 0.7f, 0.8f), 400, 0, 0, 0},
        {"inside the inner cone: N·L", Spot(0, 0, -300, 0, 0, -1, 0.4f, 0.55f), 400, 0, 0, 0.6f},
        // A point light at distance d straight in front, radius 100. A smooth zone of 100 beyond
        // it gives 3u² − 2u³, u the share of the zone still ahead: ½ at u = ½, 0.15625 at u = ¼.
        {"no falloff", Falloff(Light(kSY_LightPoint, 0, 0, -5000), 0, 100, 0), 0, 0, 0, 1},
        {"inverse square at R", Falloff(Light(kSY_LightPoint, 0, 0, -100), 2, 100, 0), 0, 0, 0, 1},
        {"(R/d)² at 2R", Falloff(Light(kSY_LightPoint, 0, 0, -200), 2, 100, 0), 0, 0, 0, 0.25f},
        {"inside R", Falloff(Light(kSY_LightPoint, 0, 0, -50), 1, 100, 100), 0, 0, 0, 1},
        {"zone u = ½", Falloff(Light(kSY_LightPoint, 0, 0, -150), 1, 100, 100), 0, 0, 0, 0.5f},
        {"zone u = ¼", Falloff(Light(kSY_LightPoint, 0, 0, -175), 1, 100, 100), 0, 0, 0, 0.15625f},
        {"zone's end", Falloff(Light(kSY_LightPoint, 0, 0, -200), 1, 100, 100), 0, 0, 0, 0},
        {"zone of no width", Falloff(Light(kSY_LightPoint, 0, 0, -150), 1, 100, 0), 0, 0, 0, 0},
    };
    for (const Case& c : cases) {
        auto shader = LitShader({&c.light});
        shader->material.ambient = c.ambient;
        shader->material.diffuse = 1;
        shader->material.lightTransmission = c.transmission;
        SY_Lighting out = LightAt(*shader, c.x, 0);
        ExpectFourLikeOne(*shader, c.x);
        for (int k = 0; k < 3; ++k) {
            EXPECT_NEAR(out.diffuse[k], c.lit * c.light.color[1 + k], 1e-6) << c.what;
            EXPECT_EQ(out.specular[k], 0) << c.what;
        }
    }
}

// A red texel (1, 0, 0) under a parallel light of colour (1, 0.8, 0.6) shows texel × D + S.
// From the eye's direction the half vector is the normal (q = 1) and the highlight is colour ×
// specular, the metal share of it in the texel's colour. A light s = 0.005 above the plane
// (N·L = s) fades it by 100·s; with V = (0, 0, −1), q = (N·H)² / |H|² = (1 + s) / 2, looked up
// in a table of cos¹ (shininess 0).
TEST(Lighting, HighlightsByMetalAndAtGrazingLight) {
    SY_SpecularTables tables;
    const double s = 0.005, g = 100 * s * std::sqrt(std::floor((1 + s) / 2 * 2048) / 2048);
    const double cases[][7] = {{1, 0, -1, 50, 1, 0, 0},
                               {0, 0, -1, 50, 1, 0.8, 0.6},
                               {0.25, 0, -1, 50, 1, 0.6, 0.45},
                               {0, std::sqrt(1 - s * s), -s, 0, g, 0.8 * g, 0.6 * g}};
    for (const auto& [metal, x, z, shininess, red, green, blue] : cases) {
        SY_LightState light = Light(kSY_LightParallel, x, 0, z);
        light.color[2] = 0.8, light.color[3] = 0.6;
        auto shader = LitShader({&light});
        shader->material.specular = 1;
        shader->material.metal = metal;
        shader->specularTable = &tables.ForShininess(shininess);
        SY_Lighting out = LightAt(*shader, 0, 0);
        ExpectFourLikeOne(*shader, 0);
        const double texel[3] = {1, 0, 0}, shown[3] = {red, green, blue};
        for (int k = 0; k < 3; ++k)
            EXPECT_NEAR(texel[k] * out.diffuse[k] + out.specular[k], shown[k], 1e-6) << metal << x;
    }
}

// A map letting through t (blue: 1 on the shadow-only path) at the given darkness. A lit layer
// with diffuse 1 facing a spot shows the light let through (the paired point lies outside the
// cone, so only the point itself is looked up); a shadow-only layer shows
// 1 − darkness × (1 − t), light without a map left out. Lookups follow the layer's
// soft-shadow switch and name the layer; a layer taking no shadows is never looked up.
TEST(Lighting, ShadowsLetThroughAKnownDarkness) {
    const std::tuple<bool, double, float, uint8_t, float> cases[] = {
        // lit, darkness, t, soft lookups, shown
        {false, 1, 0.25f, 0, 0.25f}, {false, 0.5, 0, 0, 0.5f}, {false, 0.5, 0.5f, 1, 0.75f},
        {false, 0, 0, 0, 1},         {true, 0.5, 0, 0, 0.5f},  {true, 1, 0, 0, 0},
        {true, 1, 0.25f, 1, 0.25f},
    };
    for (const auto& [lit, darkness, t, soft, shown] : cases) {
        SCOPED_TRACE(testing::Message() << lit << " " << darkness << " " << t);
        SY_LightState light =
            lit ? Spot(0, 0, -100, 0, 0, -1, 0.9f, 0.95f) : Light(kSY_LightParallel, 0, 0, -1);
        SY_LightState withoutMap = Light(lit ? kSY_LightAmbient : kSY_LightPoint, 0, 0, -100);
        light.shadowDarkness = darkness;
        auto map = std::make_unique<FixedShadow>(t, t, lit ? t : 1);
        const FixedShadow& lookups = *map;
        light.shadowMap = std::move(map);
        auto shader = LitShader({&light, &withoutMap});
        shader->material.diffuse = 1;
        shader->material.acceptsLights = lit;
        shader->material.acceptsShadows = lit ? 1 : 2;
        shader->softShadowLookup = soft;
        shader->layerId = 7;
        SY_Lighting out = LightAt(*shader, 0, 0);
        EXPECT_NEAR(out.diffuse[0], shown, 1e-6);
        EXPECT_NEAR(out.diffuse[2], lit ? shown : 1, 1e-6);
        EXPECT_EQ(out.specular[0], 0);
        if (!lit) continue;
        EXPECT_EQ(lookups.softLookups, 2 * soft);  // the point alone and in the pair
        EXPECT_EQ(lookups.hardLookups, 2 - 2 * soft);
        EXPECT_EQ(lookups.lastReceiver, 7);
        shader->material.acceptsShadows = 0;
        EXPECT_NEAR(LightAt(*shader, 0, 0).diffuse[0], 1, 1e-6);
        EXPECT_EQ(lookups.hardLookups + lookups.softLookups, 2);
    }
}

// The same layer seen from the front and from behind, with the lights mirrored through its
// plane: the normal comes turned toward the camera, so the back is lit as the front.
TEST(Lighting, BackFacingLayerIsLitLikeItsFront) {
    SY_SpecularTables tables;
    auto lit = [&](double side) {
        SY_LightState spot = Spot(30, -20, side * 200, -0.1, 0.1, side * 0.99, 0.8f, 0.95f);
        SY_LightState point = Falloff(Light(kSY_LightPoint, -50, 10, side * 80), 2, 60, 0);
        auto shader = LitShader({&spot, &point});
        shader->eye[2] = side * 1000;
        shader->material.diffuse = 0.7;
        shader->material.specular = 0.6;
        shader->material.metal = 0.3;
        shader->specularTable = &tables.ForShininess(40);
        const double n[3] = {0, 0, side};
        return LightAt(*shader, 12, 7, n);
    };
    SY_Lighting front = lit(-1), back = lit(1);
    EXPECT_GT(front.diffuse[0], 0);
    EXPECT_GT(front.specular[0], 0);
    EXPECT_EQ(std::memcmp(&front, &back, sizeof front), 0);
}

// A stretch of the layer from (−200, 0) to (200, 0) leaves out a spot whose cone (radius 145
// on the layer) falls 600 away, a light behind the layer and one whose smooth zone ends 300
// short of it; it keeps a spot and a point over it. Points along it light bit for bit the same
// with the others skipped.
TEST(Lighting, LightsThatCannotReachAStretchAreLeftOut) {
    const SY_LightState lights[] = {
        Spot(0, 0, -300, 0, 0, -1, 0.9f, 0.95f), Spot(0, 600, -300, 0, 0, -1, 0.9f, 0.95f),
        Light(kSY_LightPoint, 0, 0, 100), Falloff(Light(kSY_LightPoint, 0, 500, -10), 1, 100, 100),
        Light(kSY_LightPoint, 0, 0, -100)};
    auto shader = LitShader({&lights[0], &lights[1], &lights[2], &lights[3], &lights[4]});
    shader->material.diffuse = 1;
    const double first[3] = {-200, 0, 0}, last[3] = {200, 0, 0};
    const SY_LightSet reaching = shader->LightsReaching(first, last, kFront, 1e-3);
    EXPECT_EQ(reaching & 0x1F, 0x11u);
    for (double x = -200; x <= 200; x += 0.25) {
        const double p[3] = {x, 0, 0};
        SY_Lighting all, some;
        shader->LightOnePixel(p, kFront, &all);
        shader->LightOnePixel(p, kFront, &some, reaching);
        EXPECT_EQ(std::memcmp(&all, &some, sizeof all), 0) << x;
    }
}

// A light on the surface point has no direction and is left out silently (the paired point
// is lit by it); an eye on the point ends the frame with the math library's zero-length code,
// reported once, from either lane of a pair.
TEST(Lighting, SurfacePointOnALightOrOnTheEye) {
    SY_LightState ambient = Light(kSY_LightAmbient), onSurface = Light(kSY_LightPoint, 5, 5, 0);
    ambient.color[1] = ambient.color[2] = ambient.color[3] = 0.2;
    auto shader = LitShader({&ambient, &onSurface});
    shader->material.ambient = 1;
    shader->material.diffuse = 1;
    renderer_test::ReportCapture capture;
    EXPECT_NEAR(LightAt(*shader, 5, 5).diffuse[0], 0.2, 1e-6);
    EXPECT_TRUE(capture.reports().empty());
    shader->eye[2] = 0;
    int32_t thrown = 0;
    try {
        LightAt(*shader, 0, 0);
    } catch (int32_t code) {
        thrown = code;
    }
    EXPECT_EQ(thrown, 0x110B);
    ASSERT_EQ(capture.reports().size(), 1u);
    EXPECT_EQ(capture.reports()[0].code, 1114164);
    const double onEye[3] = {0, 0, 0}, elsewhere[3] = {1, 2, 0};
    SY_Lighting a, b;
    EXPECT_THROW(shader->LightTwoPixels(onEye, elsewhere, kFront, &a, &b), int32_t);
    EXPECT_THROW(shader->LightTwoPixels(elsewhere, onEye, kFront, &a, &b), int32_t);
}

// Which work a layer's pixels need, by its switches and lights, and what the frame adds to
// its material: the camera as the eye, a depth offset that puts later layers (here the fifth)
// behind, filtered shadow edges for best quality (every other case), and the table of the
// shininess (5 by default). Each shader leaves nothing allocated once gone.
TEST(LayerShader, WhichWorkThePixelsNeed) {
    SY_LightState ambient = Light(kSY_LightAmbient), parallel = Light(kSY_LightParallel, 0, 0, -1);
    SY_LightState parallelFalloff = Falloff(Light(kSY_LightParallel, 0, 0, -1), 1, 100, 10);
    SY_LightState point = Light(kSY_LightPoint, 0, 0, -100);
    SY_LightState shadowing = Light(kSY_LightParallel, 0, 0, -1);
    shadowing.shadowMap = std::make_unique<FixedShadow>(0, 0, 0);
    struct Case {
        const char* what;
        bool acceptsLights;
        uint8_t acceptsShadows;
        double specular;
        std::vector<const SY_LightState*> lights;
        bool shaded, needsPoint, table;
    };
    const Case cases[] = {
        {"no lights", true, 1, 0.5, {}, false, false, false},
        {"lights disabled", false, 0, 0.5, {&point}, false, false, false},
        {"lights disabled, shadows off", false, 0, 0.5, {&shadowing}, false, false, false},
        {"shadow-only without maps", false, 2, 0.5, {&point}, false, false, false},
        {"shadow-only with a map", false, 2, 0.5, {&point, &shadowing}, true, true, false},
        {"ambient only", true, 0, 0.5, {&ambient}, true, false, false},
        {"parallel, no highlight", true, 0, 0, {&ambient, &parallel}, true, false, false},
        {"parallel with a highlight", true, 0, 0.5, {&parallel}, true, true, true},
        {"parallel with falloff", true, 0, 0, {&parallelFalloff}, true, true, false},
        {"parallel with a shadow", true, 1, 0, {&shadowing}, true, true, false},
        {"parallel, shadows not taken", true, 0, 0, {&shadowing}, true, false, false},
        {"point", true, 0, 0, {&point}, true, true, false},
    };
    for (const Case& c : cases) {
        const int64_t start = U_AccountedBytes();
        {
            SY_RenderContext context;
            std::fill(context.cameraPosition, context.cameraPosition + 3, -3.0);
            SY_LayerDesc layer;
            layer.material.renderIndex = layer.material.depthIndex = 4;
            layer.material.bestQuality = (&c - cases) % 2;
            layer.material.acceptsLights = c.acceptsLights;
            layer.material.acceptsShadows = c.acceptsShadows;
            layer.material.specular = c.specular;
            SY_TRLayer renderable(layer);
            renderable.lights.Allocate(static_cast<int32_t>(c.lights.size()));
            std::copy(c.lights.begin(), c.lights.end(), renderable.lights.begin());
            auto shader = SY_MakeLayerShader(&context, std::move(renderable));
            EXPECT_EQ(shader->shaded, c.shaded) << c.what;
            EXPECT_EQ(shader->NeedsSurfacePoint(), c.needsPoint) << c.what;
            EXPECT_EQ(shader->specularTable != nullptr, c.table) << c.what;
            EXPECT_EQ(context.specularTables.Count(), c.table ? 1u : 0u) << c.what;
            const double exponent = c.table ? shader->specularTable->exponent : 0;
            EXPECT_FLOAT_EQ(exponent, c.table ? 0.5 * SY_SpecularExponent(5) : 0) << c.what;
            EXPECT_EQ(shader->eye[1], -3.0) << c.what;
            EXPECT_FLOAT_EQ(shader->depthOffset, -4e-7f) << c.what;
            EXPECT_EQ(shader->softShadowLookup, c.acceptsShadows && layer.material.bestQuality)
                << c.what;
        }
        EXPECT_EQ(U_AccountedBytes(), start) << c.what;
    }
}

}  // namespace
