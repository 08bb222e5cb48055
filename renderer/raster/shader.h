// Shaders: what a layer's pixels need besides their texels. The span routines ask a shader
// which work to do once per span and hand it the surface point and normal of each pixel.
#pragma once

#include <cstdint>
#include <memory>

#include "renderer/scene/light_state.h"
#include "renderer/scene/owned_array.h"
#include "renderer/scene/scene_desc.h"
#include "renderer/scene/specular_table.h"
#include "u_memory.h"

class SY_ShadowReach;

class SY_Shader : public U_MemTrackedObject {
public:
    virtual ~SY_Shader() = default;
    // The span routine must step the ray to each pixel's surface point.
    virtual bool NeedsSurfacePoint() const { return false; }
    // Radius in pixels of the blur a shadow caster is sampled with; 0 for sharp sampling.
    virtual int32_t ShadowBlurRadius() const { return 0; }
    // Only the alpha of the blurred samples counts, so an opaque texture needs no sums.
    virtual bool ReadsAlphaOnly() const { return false; }
    // The shader draws a frame's layer (rather than an occluder into a shadow map), so an
    // unbounded layer may take the simple path.
    virtual bool IsFrameShader() const { return true; }
};

// The shader of a layer drawn into a light's shadow map: each covered texel becomes an occluder
// that lets through what the layer's colour, alpha, opacity and light transmission let through.
// A diffused light draws the layer at several blur levels, each placed farther behind the layer
// the more it is blurred, so a shadow sharpens where it meets its caster and softens away from it.
class SY_ShadowShader : public SY_Shader {
public:
    static constexpr int32_t kMaxLevels = 11;

    // diffusion: the light's blur in map texels; perspective: the map is a face of a spot or
    // point light, whose depth is the inverse of the distance, rather than a parallel light's.
    SY_ShadowShader(const SY_Material& material, double diffusion, bool perspective);

    int32_t ShadowBlurRadius() const override;
    // A layer that passes no colour shadows by its alpha alone.
    bool ReadsAlphaOnly() const override { return transmission == 0; }
    bool IsFrameShader() const override { return false; }

    // The depth key of blur level `level` for a layer point at map depth w (larger is nearer).
    float DepthKey(double w, int32_t level) const {
        // Level 0 is the sharp one, at the layer itself.
        if (!soft || level == 0) return static_cast<float>(w);
        return static_cast<float>(perspective ? w / (1.0 + ratio[level])
                                              : w - ratio[level] * diffusion);
    }

    uint16_t layerId = 0;
    uint16_t opacity = 32768;   // 0..32768
    uint16_t transmission = 0;  // share of the layer's colour the light keeps, 0..32768
    double diffusion = 0;
    bool soft = false;
    bool perspective = true;
    int32_t levelCount = 1;
    float radius[kMaxLevels] = {};  // blur radius of each level, in map texels
    // How far behind the layer a level lies, relative to the layer's distance from the light
    // (or to the diffusion, for a parallel light): radius / (diffusion − radius).
    float ratio[kMaxLevels] = {};
    // The texels lookups can read, the only ones drawn; null for all of them.
    const SY_ShadowReach* reach = nullptr;
};

// Per-channel lighting of one pixel: texel × diffuse + specular × channel maximum.
struct SY_RenderContext;
class SY_TRLayer;

struct SY_Lighting {
    float diffuse[3];
    float specular[3];
};

// The lighting of four pixels, channel by channel: diffuse[c][i] is channel c of pixel i's.
struct SY_FourLightings {
    alignas(16) float diffuse[3][4];
    alignas(16) float specular[3][4];
};

// Four surface points as the span routines step to them: coordinate k of point i is
// ray[k][i] × invW[i], the stepped ray over W. Kept in planes, so the lighting loads each
// coordinate of all four at once and multiplies them out itself.
struct SY_FourPoints {
    alignas(16) float ray[3][4];
    alignas(32) double invW[4];

    // Point i, worked out as the four-pixel lighting works it out.
    void Point(int i, double p[3]) const {
        for (int k = 0; k < 3; ++k)
            p[k] = static_cast<double>(ray[k][i]) * invW[i];
    }
};

// A set of a layer's lights: bit i for light i. Lights from the 64th on are always in a set.
using SY_LightSet = uint64_t;
inline constexpr SY_LightSet kSY_AllLights = ~SY_LightSet{0};

class SY_LayerShader : public SY_Shader {
public:
    bool NeedsSurfacePoint() const override { return needsPoint != 0; }

    // Lights the surface point p with the unit normal n (both in world space; n turned toward
    // the camera, so a layer seen from behind is lit like its front). p is read only when
    // needsPoint is set. Throws the math library's zero-length code, after reporting it, when
    // the eye lies on the surface. Lights outside `reaching` are left out: the caller knows
    // they add nothing at p (LightsReaching).
    void LightOnePixel(const double p[3], const double n[3], SY_Lighting* out,
                       SY_LightSet reaching = kSY_AllLights) const;
    // Lights two points of the layer at once in vector registers, bit for bit as two calls of
    // LightOnePixel. Span routines use it where SY_WidestLightingLanes() gives kTwo or more.
    void LightTwoPixels(const double p1[3], const double p2[3], const double n[3],
                        SY_Lighting* out1, SY_Lighting* out2,
                        SY_LightSet reaching = kSY_AllLights) const;
    // Four points at once, bit for bit as LightOnePixel on each p.Point(i); only where
    // SY_WidestLightingLanes() gives kFour.
    void LightFourPixels(const SY_FourPoints& p, const double n[3], SY_FourLightings* out,
                         SY_LightSet reaching = kSY_AllLights) const;
    // Only the darkening by the shadows that fall on p, whether or not the layer takes light:
    // for layers drawn from an image, which are not lit.
    void ShadowOnePixel(const double p[3], const double n[3], SY_Lighting* out) const;
    // The lights that can add to the lit pixels of a stretch of the layer with the unit normal
    // n: every point of it lies within `slack` of the segment from `first` to `last`. Left out
    // are those behind the layer (when it lets no light through), those whose cone or falloff
    // misses the stretch; a set, worked out once, that spares the pixels their tests.
    SY_LightSet LightsReaching(const double first[3], const double last[3], const double n[3],
                               double slack) const;

    uint16_t layerId = 0;  // passed to every shadow lookup
    // The layer's material. A shader made by hand starts with no light terms and takes no
    // light until they are set; SY_MakeLayerShader copies the layer's. With acceptsShadows "only"
    // the texel's colour is replaced by white, so only shadows show; acceptsLights false takes
    // the shadow-only path.
    SY_Material material{
        .ambient = 0, .diffuse = 0, .specular = 0, .metal = 0, .acceptsLights = false};
    const SY_SpecularTable* specularTable = nullptr;
    SY_OwnedArray<const SY_LightState*> lights;
    double eye[3] = {};     // camera position, in world space like the surface points
    float depthOffset = 0;  // added to every depth key; layers later in render order lie behind
    uint8_t softShadowLookup = 0;  // filtered shadow-map lookups, for best-quality layers
    uint8_t shaded = 0;            // 0: pixels pass unlit
    uint8_t needsPoint = 0;        // the lighting reads the surface point
};

// How many pixels the lighting takes at once on this processor: two with SSE4.1, four with
// AVX2.
enum class SY_LightingLanes { kOne, kTwo, kFour };
SY_LightingLanes SY_WidestLightingLanes();

// The shader of a renderable drawn into the frame: its material, its lights, and which work
// its pixels need. A layer lit by no light, or one that takes no light and catches no shadow,
// passes its pixels unlit.
std::unique_ptr<SY_LayerShader> SY_MakeLayerShader(SY_RenderContext* context,
                                                   const SY_TRLayer& renderable);
