#include <gtest/gtest.h>

#include <cstring>
#include <random>
#include <vector>

#include "lighting_fixtures.h"
#include "renderer/scene/specular_table.h"
#include "u_report.h"

namespace {

using namespace lighting_test;

// Random light set-ups over every path of the lighting: each light type, cones, both falloffs,
// transmission, metal, shadow maps whose transmission differs from pixel to pixel, and the
// shadow-only path. Lights sit among the points, so pairs often have one pixel lit and the other
// skipped, and some pixels lie exactly on a light.
struct RandomScene {
    explicit RandomScene(std::mt19937& random) {
        std::uniform_real_distribution<double> coordinate(-300, 300), unit(0, 1);
        std::uniform_int_distribution<int> count(1, 5), type(0, 3), falloff(0, 2);
        int n = count(random);
        lights.resize(n);
        for (SY_LightState& light : lights) {
            light.type = type(random);
            for (int k = 0; k < 3; ++k) {
                light.position[k] = coordinate(random);
                light.direction[k] = coordinate(random);
                light.color[1 + k] = unit(random) * 1.5;
            }
            double length = std::sqrt(light.direction[0] * light.direction[0] +
                                      light.direction[1] * light.direction[1] +
                                      light.direction[2] * light.direction[2]);
            for (double& d : light.direction)
                d /= length;
            light.cosOuter = static_cast<float>(unit(random) * 0.9);
            light.cosInner = light.cosOuter + static_cast<float>(unit(random) * 0.1);
            light.coneScale = 1.0f / (light.cosInner - light.cosOuter);
            SetFalloff(&light, falloff(random), unit(random) * 200, unit(random) < 0.2 ? 0 : 150);
            light.shadowDarkness = unit(random) < 0.3 ? 1.0 : unit(random);
            if (light.type != kSY_LightAmbient && unit(random) < 0.4) {
                auto map = std::make_unique<FixedShadow>(0, 0, 0);
                map->varying = true;
                light.shadowMap = std::move(map);
            }
        }
        shader.lights.Allocate(n);
        for (int i = 0; i < n; ++i)
            shader.lights[i] = &lights[i];
        shader.material.acceptsLights = unit(random) < 0.8;
        shader.material.acceptsShadows = static_cast<uint8_t>(unit(random) * 3);
        shader.softShadowLookup = unit(random) < 0.5;
        shader.needsPoint = 1;
        shader.material.ambient = unit(random);
        shader.material.diffuse = unit(random) < 0.2 ? 0 : unit(random);
        shader.material.specular = unit(random) < 0.2 ? 0 : unit(random);
        shader.material.lightTransmission = unit(random) < 0.5 ? 0 : unit(random);
        const double metals[] = {0, 1, unit(random)};
        shader.material.metal = metals[static_cast<int>(unit(random) * 3)];
        shader.specularTable = &tables.ForShininess(unit(random) * 100);
        shader.eye[0] = coordinate(random);
        shader.eye[1] = coordinate(random);
        shader.eye[2] = -2000;
        for (int k = 0; k < 3; ++k)
            normal[k] = coordinate(random);
        double length =
            std::sqrt(normal[0] * normal[0] + normal[1] * normal[1] + normal[2] * normal[2]);
        for (double& c : normal)
            c /= length;
    }

    SY_SpecularTables tables;
    std::vector<SY_LightState> lights;
    SY_LayerShader shader;
    double normal[3];
};

bool Same(const SY_Lighting& a, const SY_Lighting& b) {
    return std::memcmp(&a, &b, sizeof a) == 0;
}

TEST(LightingPair, SameAsOnePixelBitForBit) {
    std::mt19937 random(20261206);
    std::uniform_real_distribution<double> coordinate(-400, 400);
    std::uniform_int_distribution<int> pick(0, 9);
    int highlights = 0, shadowed = 0, pairsThatDiffer = 0;
    for (int scene = 0; scene < 300; ++scene) {
        RandomScene setup(random);
        for (int pair = 0; pair < 60; ++pair) {
            double p[2][3];
            for (auto& point : p) {
                for (double& c : point)
                    c = coordinate(random);
                // Now and then a pixel exactly on a light, whose vector is then degenerate.
                if (pick(random) == 0) {
                    const SY_LightState& light = setup.lights[pick(random) % setup.lights.size()];
                    std::copy(light.position, light.position + 3, point);
                }
            }
            SY_Lighting one[2], two[2];
            setup.shader.LightOnePixel(p[0], setup.normal, &one[0]);
            setup.shader.LightOnePixel(p[1], setup.normal, &one[1]);
            setup.shader.LightTwoPixels(p[0], p[1], setup.normal, &two[0], &two[1]);
            ASSERT_TRUE(Same(one[0], two[0]) && Same(one[1], two[1]))
                << "scene " << scene << " pair " << pair << ": " << one[0].diffuse[0] << " vs "
                << two[0].diffuse[0] << ", " << one[1].diffuse[0] << " vs " << two[1].diffuse[0];
            for (const SY_Lighting& out : one) {
                highlights += out.specular[0] != 0;
                shadowed += !setup.shader.material.acceptsLights && out.diffuse[0] != 1;
            }
            pairsThatDiffer += !Same(one[0], one[1]);
        }
    }
    // The set-ups reach the highlights and the shadows, and pairs are not trivially alike.
    EXPECT_GT(highlights, 1000);
    EXPECT_GT(shadowed, 200);
    EXPECT_GT(pairsThatDiffer, 10000);
}

TEST(LightingPair, EyeOnEitherSurfacePointThrows) {
    SY_LightState light = Point(0, 0, -100);
    auto shader = LitShader({&light});
    const double onEye[3] = {0, 0, -1000}, elsewhere[3] = {1, 2, 0};
    SY_Lighting a, b;
    U_Reporter previous = U_SetReporter([](const U_Report&) {});
    EXPECT_THROW(shader->LightTwoPixels(onEye, elsewhere, kFront, &a, &b), int32_t);
    EXPECT_THROW(shader->LightTwoPixels(elsewhere, onEye, kFront, &a, &b), int32_t);
    U_SetReporter(previous);
}

}  // namespace
