#include "cli/info_command.h"

#include <algorithm>
#include <iomanip>
#include <optional>
#include <string>
#include <vector>

#include "cli/artisan_instance.h"
#include "composition/render_order.h"
#include "composition/renderer_options.h"
#include "composition/transform.h"
#include "host_error.h"
#include "pf_xfer.h"
#include "session/frame_suites.h"

namespace ostrel {
namespace {

const char* KindName(LayerKind kind) {
    switch (kind) {
        case LayerKind::kImage:
            return "image";
        case LayerKind::kSolid:
            return "solid";
        case LayerKind::kNull:
            return "null";
        case LayerKind::kCamera:
            return "camera";
        case LayerKind::kLight:
            return "light";
    }
    return "?";
}

const char* QualityName(Quality quality) {
    switch (quality) {
        case Quality::kWireframe:
            return "wireframe";
        case Quality::kDraft:
            return "draft";
        case Quality::kBest:
            return "best";
    }
    return "?";
}

const char* LightTypeName(LightType type) {
    switch (type) {
        case LightType::kParallel:
            return "parallel";
        case LightType::kSpot:
            return "spot";
        case LightType::kPoint:
            return "point";
        case LightType::kAmbient:
            return "ambient";
    }
    return "?";
}

std::string Quoted(const std::string& name) {
    return "\"" + name + "\"";
}

// Whether the light builds shadow maps at the frame and how large, by the renderer's rule: a
// light that casts at a darkness above 0, when some layer casts and some accepts shadows; the
// side is the chosen size ("Comp Size": the larger of 400 and the output's larger side), a
// third of it when no receiver is at best quality, at least 64; a spot wider than 80° takes
// five faces and a point light six.
std::string ShadowMaps(const Composition& comp, const Layer& light, double seconds,
                       const std::vector<int32_t>& order) {
    if (!light.light.castsShadows) return "";
    if (light.light.shadowDarkness.ValueAt(seconds) == 0) return ", casts shadows of darkness 0";
    bool casts = false, accepts = false, bestReceiver = false;
    for (int32_t index : order) {
        const Layer& layer = comp.layers[static_cast<size_t>(index)];
        if (layer.quality == Quality::kWireframe) continue;
        casts = casts || layer.material.castsShadows != ShadowMode::kOff;
        bool receives = layer.material.acceptsShadows != ShadowMode::kOff;
        accepts = accepts || receives;
        bestReceiver = bestReceiver || (receives && layer.quality == Quality::kBest);
    }
    if (!casts) return ", casts shadows but no layer casts any";
    if (!accepts) return ", casts shadows but no layer accepts any";
    int32_t faces = 1;
    if (light.light.type == LightType::kPoint) faces = 6;
    if (light.light.type == LightType::kSpot && light.light.coneAngle.ValueAt(seconds) > 80)
        faces = 5;
    std::string count = faces == 1 ? "a map" : std::to_string(faces) + " maps";
    std::optional<int32_t> choice = ShadowMapSizeChoice(comp.rendererOptions);
    int32_t chosen = choice ? kShadowMapSizes[static_cast<size_t>(*choice)] : 0;
    int32_t side = chosen != 0 ? chosen : std::max({400, comp.width, comp.height});
    if (!bestReceiver) side /= 3;
    side = std::max(side, 64);
    return ", casts shadows: " + count + " of " + std::to_string(side) + " x " +
           std::to_string(side);
}

}  // namespace

void PrintInfo(const Composition& comp, int32_t frame, std::ostream& out) {
    double seconds = T_Seconds(comp.FrameTime(frame));
    out << comp.file.string() << '\n';
    out << "  size         " << comp.width << " x " << comp.height << ", pixel aspect "
        << comp.pixelAspect << '\n';
    out << "  depth        " << comp.bitDepth << (comp.bitDepth == 32 ? " bits float" : " bits")
        << '\n';
    out << "  frames       0-" << comp.FrameCount() - 1 << " at " << comp.frameRate.numerator;
    if (comp.frameRate.denominator != 1) out << '/' << comp.frameRate.denominator;
    out << " fps (" << comp.duration << " s)\n";
    out << "  motion blur  ";
    if (comp.motionBlur.enabled) {
        out << comp.motionBlur.samplesPerFrame << " samples, shutter angle "
            << comp.motionBlur.shutterAngle << ", phase " << comp.motionBlur.shutterPhase << '\n';
    } else {
        out << "off\n";
    }

    int32_t camera = ActiveCamera(comp, seconds);
    out << "  camera       ";
    if (camera < 0) {
        out << "default, zoom " << DefaultCameraDistance(comp) << '\n';
    } else {
        const Layer& c = comp.layers[static_cast<size_t>(camera)];
        out << Quoted(c.name) << (c.camera.orthographic ? ", orthographic" : ", perspective")
            << (c.camera.depthOfField.enabled && comp.lightsAndDepthOfField ? ", depth of field"
                                                                            : "")
            << '\n';
    }

    std::vector<int32_t> order = RenderOrder(comp, seconds);
    out << "  lights      ";
    bool anyLight = false;
    for (const Layer& layer : comp.layers) {
        if (layer.kind != LayerKind::kLight || !layer.IsActiveAt(seconds)) continue;
        out << (anyLight ? ", " : " ") << Quoted(layer.name) << " ("
            << LightTypeName(layer.light.type) << ShadowMaps(comp, layer, seconds, order) << ')';
        anyLight = true;
    }
    if (!comp.lightsAndDepthOfField) {
        out << " none: lights and depth of field are switched off";
    } else if (!anyLight) {
        out << " none";
    }
    out << '\n';

    std::optional<int32_t> choice = ShadowMapSizeChoice(comp.rendererOptions);
    out << "  shadow maps  "
        << (!choice       ? "Comp Size (rendererOptions is not the renderer's 12-byte form)"
            : *choice > 0 ? ShadowMapSizeText(*choice) + " pixels"
                          : ShadowMapSizeText(0))
        << '\n';
    out << "  layers rendered at frame " << frame << ", in render order:\n";
    if (order.empty()) out << "    none\n";
    for (size_t i = 0; i < order.size(); ++i) {
        const Layer& layer = comp.layers[static_cast<size_t>(order[i])];
        out << "    " << std::setw(3) << i << "  " << std::left << std::setw(24)
            << Quoted(layer.name) << std::setw(6) << KindName(layer.kind) << " 3-D  "
            << std::setw(10) << QualityName(layer.quality) << layer.transferMode
            << (PF_XferModeFromName(layer.transferMode) < 0 ? " (unknown mode)" : "")
            << (layer.source.unbounded ? ", unbounded" : "")
            << (layer.trackMatte != TrackMatte::kNone
                    ? ", matte " + Quoted(comp.layers[static_cast<size_t>(layer.matteLayer)].name)
                    : "")
            << std::right << '\n';
    }
}

void ShowAbout(const std::vector<std::filesystem::path>& pluginFolders) {
    HostSuites suites;
    PluginHost plugins;
    const Artisan& artisan = LoadArtisan(plugins, pluginFolders, kRendererMatchName);
    const QNGP_InData* in = plugins.InDataFor(artisan.pluginId);
    if (!artisan.entries.about) {
        throw HostError("the renderer \"" + artisan.displayName + "\" has no about box");
    }
    if (int32_t error = artisan.entries.about(in)) {
        throw HostError("the renderer's about box failed with error " + std::to_string(error));
    }
}

}  // namespace ostrel
