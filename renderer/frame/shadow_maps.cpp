#include "renderer/frame/shadow_maps.h"

#include <algorithm>
#include <cmath>
#include <memory>
#include <new>

#include "renderer/mbuffer/shadow_fragments.h"
#include "renderer/raster/shader.h"
#include "renderer/raster/shadow_reach.h"
#include "renderer/scene/depth_grouping.h"
#include "renderer/scene/layer_projection.h"
#include "renderer/scene/render_context.h"
#include "renderer/scene/render_target.h"

namespace {

// A parallel light's map puts everything less than this far behind the light's plane in front
// of it, so that layers on both sides of the light's position cast.
constexpr double kParallelDepthShift = 50000;
// A cube face spans 100°, so neighbouring faces overlap by 10° for the blend at their seams.
constexpr double kTanHalfFace = 1.19175359259421;  // tan 50°
// A spot whose cone is wider than 40° overflows one face and takes five.
constexpr double kCosWidestSingleFace = 0.76604444;
constexpr double kQuarterTurn = 1.5707963267948966;
constexpr double kHalfTurn = 3.141592653589793;

void Check(int32_t error) {
    if (error) throw error;
}

bool LitBy(const SY_LayerDesc& layer, int32_t lightId) {
    return std::find(layer.lightIds.begin(), layer.lightIds.end(), lightId) != layer.lightIds.end();
}

struct ShadowRoles {
    bool anyCaster = false;
    bool anyReceiver = false;
    bool bestReceiver = false;  // some layer accepts shadows at best quality
};

ShadowRoles RolesOf(const SY_SceneDesc& scene) {
    ShadowRoles roles;
    for (const SY_LayerDesc& layer : scene.layers) {
        roles.anyCaster = roles.anyCaster || layer.material.castsShadows;
        bool accepts = layer.material.acceptsShadows != kSY_AcceptsShadowsOff;
        roles.anyReceiver = roles.anyReceiver || accepts;
        roles.bestReceiver = roles.bestReceiver || (accepts && layer.material.bestQuality);
    }
    return roles;
}

// The diffusion in map texels: it is given in output pixels of a full-quality map, whose side
// is the output's larger side.
double DiffusionTexels(const SY_LightState& light, int32_t size, int32_t width, int32_t height) {
    return light.shadowDiffusion * size / std::max({400, width, height});
}

struct FaceTurn {
    double x;
    double y;
};

// The turns of the faces a spot or point light renders, the one along its axis first.
int32_t FaceTurns(const SY_LightDesc& light, FaceTurn turns[6]) {
    int32_t count = 0;
    turns[count++] = {0, 0};
    float cosOuter = static_cast<float>(std::cos(light.coneHalfAngle));
    if (light.type == kSY_LightPoint || cosOuter < kCosWidestSingleFace) {
        turns[count++] = {0, -kQuarterTurn};
        turns[count++] = {0, kQuarterTurn};
        turns[count++] = {-kQuarterTurn, 0};
        turns[count++] = {kQuarterTurn, 0};
        if (light.type == kSY_LightPoint) turns[count++] = {0, kHalfTurn};
    }
    return count;
}

M_LRect PixelRect(const SY_TRLayer& renderable, int32_t size) {
    auto clamp = [size](double v) {
        return static_cast<int32_t>(std::clamp(v, 0.0, double(size)));
    };
    return {clamp(std::floor(renderable.bounds[0])), clamp(std::floor(renderable.bounds[1])),
            clamp(std::ceil(renderable.bounds[2])), clamp(std::ceil(renderable.bounds[3]))};
}

// Merges the occluder lists of every array at each texel into one run, nearest the light first;
// array k has lists within occupied[k] only.
// Each entry's transmission is the product of what every layer passed so far lets through, a
// layer counting by its last entry passed (its blur levels replace one another).
class MapMerge {
public:
    MapMerge(const SY_ShadowFragmentArrayList& arrays, const SY_AccountedVector<M_LRect>& occupied)
        : arrays_(arrays), occupied_(occupied) {
        int32_t n = arrays.Count();
        texels_ = occupied[0];
        size_t total = 0;
        for (int32_t k = 0; k < n; ++k) {
            const M_LRect& b = occupied[size_t(k)];
            texels_.left = std::min(texels_.left, b.left);
            texels_.top = std::min(texels_.top, b.top);
            texels_.right = std::max(texels_.right, b.right);
            texels_.bottom = std::max(texels_.bottom, b.bottom);
            total += arrays[k]->FragmentCount();
        }
        size_t texelCount = size_t(texels_.right - texels_.left) * (texels_.bottom - texels_.top);
        starts_ = SY_ShadowBlock<uint32_t>("shadow map", texelCount + 1);
        entries_ = SY_ShadowBlock<SY_ShadowEntry>("shadow map vertices", total);
        next_.resize(size_t(n));
        passed_.resize(size_t(n) * 3);
        rowArrays_.reserve(size_t(n));
        covering_.reserve(size_t(n));
        rowCovers_.resize(size_t(texels_.right - texels_.left));
        rowFirst_.resize(size_t(texels_.right - texels_.left));
        rowSecond_.resize(size_t(texels_.right - texels_.left));
    }

    const M_LRect& Texels() const { return texels_; }

    void Run() {
        size_t texel = 0;
        for (int32_t y = texels_.top; y < texels_.bottom; ++y) {
            rowArrays_.clear();
            for (int32_t k = 0; k < arrays_.Count(); ++k) {
                const M_LRect& b = occupied_[size_t(k)];
                if (y >= b.top && y < b.bottom) rowArrays_.push_back(k);
            }
            CountCovers(y);
            for (int32_t x = texels_.left; x < texels_.right; ++x) {
                starts_[texel++] = written_;
                const size_t column = size_t(x - texels_.left);
                switch (rowCovers_[column]) {
                    case 0:
                        break;
                    case 1:
                        CopyList(rowFirst_[column]);
                        break;
                    case 2:
                        MergeTwo(rowFirst_[column], rowSecond_[column]);
                        break;
                    default:
                        MergeTexel(x, y);
                }
            }
        }
        starts_[texel] = written_;
    }

    SY_ShadowBlock<uint32_t> TakeStarts() { return std::move(starts_); }
    SY_ShadowBlock<SY_ShadowEntry> TakeEntries() { return std::move(entries_); }

private:
    // How many arrays have a list at each texel of row y (up to 3), and the first two lists
    // in array order: most texels lie under one caster or none, and most of the rest under
    // two.
    void CountCovers(int32_t y) {
        // Locals, as the counts are bytes, whose stores the compiler takes to alias every
        // member.
        uint8_t* const covers = rowCovers_.data();
        const SY_ShadowFragment** const first = rowFirst_.data();
        const SY_ShadowFragment** const second = rowSecond_.data();
        std::fill_n(covers, rowCovers_.size(), uint8_t{0});
        for (int32_t k : rowArrays_) {
            const M_LRect& b = occupied_[size_t(k)];
            SY_ShadowFragment* const* const heads = arrays_[k]->HeadAt(b.left, y);
            const size_t offset = size_t(b.left - texels_.left), count = size_t(b.right - b.left);
            for (size_t i = 0; i < count; ++i) {
                const SY_ShadowFragment* head = heads[i];
                if (!head) continue;
                const size_t column = offset + i;
                const uint8_t c = covers[column];
                if (c == 0)
                    first[column] = head;
                else if (c == 1)
                    second[column] = head;
                covers[column] = static_cast<uint8_t>(std::min(3, c + 1));
            }
        }
    }

    // One layer's list is already in order, each entry what that layer lets through; its
    // entries all carry the layer's id, so none of them is a step.
    void CopyList(const SY_ShadowFragment* f) {
        for (; f; f = f->next)
            Write(*f, f->red, f->green, f->blue);
    }

    void MarkSteps(uint32_t begin) {
        for (uint32_t i = begin; i + 1 < written_; ++i) {
            if (entries_[i].tag != (entries_[i + 1].tag & kSY_ShadowIdMask))
                entries_[i].tag |= kSY_ShadowStep;
        }
    }

    // MergeLists for the lists of two arrays, a that of the earlier array, without the
    // bookkeeping for any number of them: the same order and the same products.
    void MergeTwo(const SY_ShadowFragment* a, const SY_ShadowFragment* b) {
        const uint32_t begin = written_;
        // Until the second layer is passed, the product is the occluder's own transmission.
        bool firstB = false, alone = true;
        float passedA[3] = {1, 1, 1}, passedB[3] = {1, 1, 1};
        while (a || b) {
            const bool takeB = b && (!a || b->depth > a->depth);
            const SY_ShadowFragment& f = takeB ? *b : *a;
            float* own = takeB ? passedB : passedA;
            if (takeB)
                b = b->next;
            else
                a = a->next;
            own[0] = f.red * (1.0f / 32768);
            own[1] = f.green * (1.0f / 32768);
            own[2] = f.blue * (1.0f / 32768);
            if (written_ == begin) firstB = takeB;
            alone = alone && takeB == firstB;
            if (alone) {
                Write(f, f.red, f.green, f.blue);
                continue;
            }
            Write(f, static_cast<uint16_t>(passedA[0] * passedB[0] * 32768 + 0.5f),
                  static_cast<uint16_t>(passedA[1] * passedB[1] * 32768 + 0.5f),
                  static_cast<uint16_t>(passedA[2] * passedB[2] * 32768 + 0.5f));
        }
        MarkSteps(begin);
    }

    void MergeTexel(int32_t x, int32_t y) {
        covering_.clear();
        for (int32_t k : rowArrays_) {
            const M_LRect& b = occupied_[size_t(k)];
            if (x < b.left || x >= b.right) continue;
            if (const SY_ShadowFragment* f = *arrays_[k]->HeadAt(x, y)) {
                next_[k] = f;
                covering_.push_back(k);
            }
        }
        uint32_t begin = written_;
        MergeLists();
        MarkSteps(begin);
    }

    void MergeLists() {
        for (int32_t k : covering_)
            std::fill_n(&passed_[size_t(k) * 3], 3, 1.0f);
        // Until a second layer is passed, every other factor of the product is exactly 1, so
        // the product is the occluder's own transmission, bit for bit.
        int32_t first = -1;
        bool alone = true;
        for (;;) {
            // The nearest next occluder; on a tie the earlier array's goes first.
            int32_t nearest = -1;
            for (int32_t k : covering_) {
                if (next_[k] && (nearest < 0 || next_[k]->depth > next_[nearest]->depth))
                    nearest = k;
            }
            if (nearest < 0) break;
            const SY_ShadowFragment& f = *next_[nearest];
            next_[nearest] = f.next;
            float* own = &passed_[size_t(nearest) * 3];
            own[0] = f.red * (1.0f / 32768);
            own[1] = f.green * (1.0f / 32768);
            own[2] = f.blue * (1.0f / 32768);
            if (first < 0) first = nearest;
            alone = alone && nearest == first;
            if (alone) {
                Write(f, f.red, f.green, f.blue);
                continue;
            }
            float product[3] = {1, 1, 1};
            for (int32_t k : covering_) {
                for (int c = 0; c < 3; ++c)
                    product[c] *= passed_[size_t(k) * 3 + c];
            }
            Write(f, static_cast<uint16_t>(product[0] * 32768 + 0.5f),
                  static_cast<uint16_t>(product[1] * 32768 + 0.5f),
                  static_cast<uint16_t>(product[2] * 32768 + 0.5f));
        }
    }

    void Write(const SY_ShadowFragment& f, uint16_t red, uint16_t green, uint16_t blue) {
        SY_ShadowEntry& e = entries_[written_++];
        e.depth = f.depth;
        e.tag = f.value16 < kSY_ShadowNoLayer ? f.value16 : kSY_ShadowNoLayer;
        e.red = red;
        e.green = green;
        e.blue = blue;
    }

    const SY_ShadowFragmentArrayList& arrays_;
    const SY_AccountedVector<M_LRect>& occupied_;
    M_LRect texels_;
    SY_ShadowBlock<uint32_t> starts_;
    SY_ShadowBlock<SY_ShadowEntry> entries_;
    uint32_t written_ = 0;
    SY_AccountedVector<const SY_ShadowFragment*> next_;
    SY_AccountedVector<float> passed_;  // red, green, blue let through by each array so far
    SY_AccountedVector<int32_t> rowArrays_;
    SY_AccountedVector<int32_t> covering_;
    SY_AccountedVector<uint8_t> rowCovers_;
    SY_AccountedVector<const SY_ShadowFragment*> rowFirst_;
    SY_AccountedVector<const SY_ShadowFragment*> rowSecond_;
};

// What one face of a light needs to render its map.
struct FaceJob {
    const M_Matrix4* view;  // world to the light's eye
    FaceTurn turn;
    double focal;  // 0: parallel light
    int32_t size;
    const SY_LightState* light;
    double diffusion;           // map texels
    SY_ShadowReach::Disc cone;  // a spot light's cone, beyond which no lookup reads
};

// What one receiver's lookups can read: its id and the box of its points in the map.
struct ReceiverReach {
    int32_t renderIndex;
    SY_ShadowReach::Box box;
};

// A receiver's lookups are of points of its quadrilateral, grown by this much (in its own
// pixels) for the frame's pixels along its edges, whose points lie up to half a pixel's diagonal
// beyond it: enough where the layer shows up to ninety times smaller than its own pixels. The
// growth costs nothing measurable, as texels near a receiver are mostly drawn anyway.
constexpr double kReceiverGrowth = 64;
// A soft lookup reads texels whose centres lie up to 2.5 texels from its point; a texel more
// covers rounding.
constexpr double kLookupReach = 4;

// Renders the casting layers of the light into occluder lists through the face, and builds the
// face's map from them; null when no layer shadows another in the face.
std::unique_ptr<SY_PlanarShadowMap> RenderFace(SY_RenderContext* context, const FaceJob& job) {
    M_Matrix4 worldToMap = *job.view;
    if (job.turn.x != 0 || job.turn.y != 0)
        Check(M_RotateMatrix4XYZ(job.turn.x, job.turn.y, 0, &worldToMap));
    bool perspective = job.focal != 0;
    if (perspective)
        worldToMap.Project(job.focal);
    else
        Check(M_TranslateMatrix4(0, 0, kParallelDepthShift, &worldToMap));
    // The light's axis through the map's centre.
    Check(M_TranslateMatrix4(job.size * 0.5, job.size * 0.5, 0, &worldToMap));

    const SY_CameraView camera{&worldToMap, 1, perspective};
    SY_SetUpOptions options;
    options.output = {0, 0, static_cast<double>(job.size), static_cast<double>(job.size)};
    SY_Renderables casters, receivers;
    SY_AccountedVector<ReceiverReach> reaches;
    for (const SY_LayerDesc& layer : context->scene->layers) {
        const SY_Material& material = layer.material;
        bool accepts = material.acceptsShadows != kSY_AcceptsShadowsOff;
        if (material.opacity == 0 || !(material.castsShadows || accepts) ||
            !LitBy(layer, job.light->id)) {
            continue;
        }
        options.depthOffset = material.depthIndex * kSY_DepthStepPerIndex;
        if (accepts) {
            SY_TRLayer receiver(layer);
            options.margin = 0;
            if (SY_SetUpRenderable(layer, camera, options, &receiver))
                receivers.push_back(std::move(receiver));
            // Where its lookups fall, beyond the face too: near its border they read texels
            // inside.
            SY_SetUpOptions grown = options;
            grown.margin = kReceiverGrowth;
            grown.noClip = true;
            SY_TRLayer reach(layer);
            if (SY_SetUpRenderable(layer, camera, grown, &reach)) {
                const double* b = reach.bounds;
                reaches.push_back({material.renderIndex,
                                   {b[0] - kLookupReach, b[1] - kLookupReach, b[2] + kLookupReach,
                                    b[3] + kLookupReach}});
            }
        }
        if (material.castsShadows) {
            // A blurred shadow spreads beyond its caster's outline.
            SY_TRLayer caster(layer);
            options.margin = std::ceil(job.diffusion);
            if (SY_SetUpRenderable(layer, camera, options, &caster))
                casters.push_back(std::move(caster));
        }
    }

    context->renderablesDone = 0;
    context->renderableCount = static_cast<int32_t>(casters.size());
    const SY_DepthSense sense = SY_DepthSenseOf(perspective);
    struct Drawn {
        SY_TRLayer* caster;
        M_LRect rect;
    };
    SY_AccountedVector<Drawn> drawn;
    for (SY_TRLayer& caster : casters) {
        // Only a caster that lies in front of some other receiver somewhere is drawn.
        bool shadowsAny = std::any_of(receivers.begin(), receivers.end(), [&](const SY_TRLayer& r) {
            return r.material.renderIndex != caster.material.renderIndex &&
                   SY_RelateRenderables(caster, r, sense).bFirst;
        });
        M_LRect rect = PixelRect(caster, job.size);
        if (shadowsAny && rect.right > rect.left && rect.bottom > rect.top)
            drawn.push_back({&caster, rect});
    }
    SY_ShadowFragmentArrayList arrays;
    SY_AccountedVector<M_LRect> occupied;  // where each array can have lists
    SY_AccountedVector<SY_ShadowReach::Box> boxes;
    for (const Drawn& d : drawn) {
        // A caster's texels matter to the lookups of every other receiver, and, through the
        // light they leave to the occluders behind them, wherever another caster's do; its
        // own lookups look past it.
        const int32_t id = d.caster->material.renderIndex;
        boxes.clear();
        for (const ReceiverReach& r : reaches) {
            if (r.renderIndex != id) boxes.push_back(r.box);
        }
        for (const Drawn& other : drawn) {
            const M_LRect& o = other.rect;
            if (&other != &d)
                boxes.push_back({double(o.left), double(o.top), double(o.right), double(o.bottom)});
        }
        SY_ShadowReach reach(d.rect, boxes, job.cone);
        SY_ShadowFragmentArray* array = arrays.Append(d.rect);
        occupied.push_back(reach.Bounds());
        SY_ShadowShader shader(d.caster->material, job.diffusion, perspective);
        shader.reach = &reach;
        d.caster->Render(context, camera, &shader, 0, SY_RenderTarget(*array));
    }
    // The arrays that received nothing go; so do their rectangles.
    size_t kept = 0;
    for (int32_t k = 0; k < arrays.Count(); ++k) {
        if (arrays[k]->FragmentCount() != 0) occupied[kept++] = occupied[size_t(k)];
    }
    occupied.resize(kept);
    arrays.Compact();
    if (arrays.Count() == 0) return nullptr;

    // The map's texels span the lists only: those beyond are empty, as a lookup outside the
    // texels takes them.
    MapMerge merge(arrays, occupied);
    merge.Run();
    const double face[4] = {0, 0, static_cast<double>(job.size), static_cast<double>(job.size)};
    return std::make_unique<SY_PlanarShadowMap>(worldToMap, perspective, face, merge.Texels(),
                                                merge.TakeStarts(), merge.TakeEntries());
}

// The placement turns and scales alike along every axis, so that its view keeps angles.
bool KeepsAngles(const M_Matrix4& placement) {
    auto dot = [&](int a, int b) {
        return placement.mat[a][0] * placement.mat[b][0] +
               placement.mat[a][1] * placement.mat[b][1] +
               placement.mat[a][2] * placement.mat[b][2];
    };
    const double scale = dot(0, 0), tolerance = 1e-9 * scale;
    return scale > 0 && std::fabs(dot(1, 1) - scale) <= tolerance &&
           std::fabs(dot(2, 2) - scale) <= tolerance && std::fabs(dot(0, 1)) <= tolerance &&
           std::fabs(dot(0, 2)) <= tolerance && std::fabs(dot(1, 2)) <= tolerance;
}

// The disc of a spot light's only face outside which lookups read nothing, none where that is
// not known. The lighting looks up only points within the cone, which the face sees as a disc
// of radius focal · tan(half angle) about its centre; the margin covers the diagonal of a soft
// lookup's reach.
SY_ShadowReach::Disc SpotCone(const SY_LightDesc& desc, const M_Matrix4& placement, double focal,
                              int32_t size, int32_t faces) {
    if (desc.type != kSY_LightSpot || faces != 1 || !KeepsAngles(placement)) return {};
    return {size * 0.5, size * 0.5, focal * std::tan(desc.coneHalfAngle) + kLookupReach};
}

std::unique_ptr<SY_ShadowMap> BuildLightMap(SY_RenderContext* context, const SY_LightDesc& desc,
                                            const SY_LightState& light, int32_t size) {
    const M_Matrix4& placement = desc.placements[desc.placements.Count() / 2];
    M_Matrix4 view;
    Check(M_InverseMatrix4(&placement, &view));
    FaceJob job{
        &view,
        {0, 0},
        0,
        size,
        &light,
        DiffusionTexels(light, size, context->destination->width, context->destination->height),
        {}};
    if (desc.type == kSY_LightParallel) return RenderFace(context, job);

    job.focal = 0.5 * size / kTanHalfFace;
    FaceTurn turns[6];
    int32_t count = FaceTurns(desc, turns);
    job.cone = SpotCone(desc, placement, job.focal, size, count);
    auto cube = std::make_unique<SY_CubicShadowMap>();
    for (int32_t i = 0; i < count; ++i) {
        job.turn = turns[i];
        if (std::unique_ptr<SY_PlanarShadowMap> face = RenderFace(context, job))
            cube->Add(std::move(face));
    }
    if (cube->FaceCount() == 1) return cube->TakeOnlyFace();
    if (cube->FaceCount() == 0) return nullptr;
    return cube;
}

}  // namespace

SY_ShadowMapPlan SY_PlanShadowMap(const SY_SceneDesc& scene, int32_t lightIndex,
                                  int32_t outputWidth, int32_t outputHeight) {
    const SY_LightDesc& light = scene.lights[lightIndex];
    ShadowRoles roles = RolesOf(scene);
    SY_ShadowMapPlan plan;
    if (!roles.anyCaster || !roles.anyReceiver || !light.castsShadows ||
        light.shadowDarkness == 0 || light.type == kSY_LightAmbient || light.placements.Empty()) {
        return plan;
    }
    plan.size = SY_ShadowMapSize(light.shadowMapSize, outputWidth, outputHeight, scene.downsampleX,
                                 roles.bestReceiver);
    FaceTurn turns[6];
    plan.faces = light.type == kSY_LightParallel ? 1 : FaceTurns(light, turns);
    return plan;
}

void SY_BuildShadowMaps(SY_RenderContext* context) {
    const SY_SceneDesc& scene = *context->scene;
    try {
        for (int32_t i = 0; i < scene.lights.Count(); ++i) {
            SY_ShadowMapPlan plan = SY_PlanShadowMap(scene, i, context->destination->width,
                                                     context->destination->height);
            if (plan.size == 0) continue;
            SY_LightState& light = context->lightStates[i];
            light.shadowMap = BuildLightMap(context, scene.lights[i], light, plan.size);
        }
        context->shadowSums.Clear();
    } catch (const std::bad_alloc&) {
        // Maps built so far stay with their light states, which the frame releases.
        throw kU_ErrOutOfMemory;
    }
}
