#include "cli/info_command.h"

#include <iomanip>
#include <optional>

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

    out << "  lights      ";
    bool anyLight = false;
    for (const Layer& layer : comp.layers) {
        if (layer.kind != LayerKind::kLight || !layer.IsActiveAt(seconds)) continue;
        out << (anyLight ? ", " : " ") << Quoted(layer.name) << " ("
            << LightTypeName(layer.light.type)
            << (layer.light.castsShadows ? ", casts shadows" : "") << ')';
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

    std::vector<int32_t> order = RenderOrder(comp, seconds);
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
