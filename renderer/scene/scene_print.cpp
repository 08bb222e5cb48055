#include "renderer/scene/scene_print.h"

#include <ios>

namespace {

// A switch is named when it is on and left out when it is off, so a record reads as what it has.
void Switch(std::ostream& out, bool on, const char* name) {
    if (on) out << ' ' << name;
}

const char* LightTypeName(int32_t type) {
    switch (type) {
        case kSY_LightParallel:
            return "parallel";
        case kSY_LightSpot:
            return "spot";
        case kSY_LightPoint:
            return "point";
        case kSY_LightAmbient:
            return "ambient";
        default:
            return nullptr;
    }
}

}  // namespace

std::ostream& operator<<(std::ostream& out, SY_SamplingFilter filter) {
    switch (filter) {
        case SY_SamplingFilter::kNearest:
            return out << "nearest";
        case SY_SamplingFilter::kBilinear:
            return out << "bilinear";
        case SY_SamplingFilter::kBicubic:
            return out << "bicubic";
    }
    return out << "filter " << +static_cast<uint8_t>(filter);
}

std::ostream& operator<<(std::ostream& out, const SY_Material& m) {
    out << "material{renderIndex=" << m.renderIndex << " depthIndex=" << m.depthIndex << " mode=0x"
        << std::hex << +m.mode << std::dec << " opacity=" << m.opacity << " ambient=" << m.ambient
        << " diffuse=" << m.diffuse << " specular=" << m.specular << " shininess=" << m.shininess
        << " lightTransmission=" << m.lightTransmission << " metal=" << m.metal
        << " acceptsShadows=" << +m.acceptsShadows << " engineFlag=" << m.engineFlag;
    Switch(out, m.renders, "renders");
    Switch(out, m.wireframe, "wireframe");
    Switch(out, m.castsShadows, "castsShadows");
    Switch(out, m.acceptsLights, "acceptsLights");
    Switch(out, m.bestQuality, "bestQuality");
    Switch(out, m.motionBlur, "motionBlur");
    return out << '}';
}

std::ostream& operator<<(std::ostream& out, const SY_LayerDesc& l) {
    out << "layer{compIndex=" << l.compIndex << " source=[" << l.left << ',' << l.top << ' '
        << l.right << ',' << l.bottom << "] scale=" << l.scaleX << 'x' << l.scaleY
        << " placements=" << l.placements.Count() << ' ' << l.material << " lightIds=[";
    for (size_t i = 0; i < l.lightIds.size(); ++i)
        out << (i ? "," : "") << l.lightIds[i];
    out << ']';
    Switch(out, l.collapsed, "collapsed");
    Switch(out, l.unbounded, "unbounded");
    Switch(out, l.trackMatte != nullptr, "trackMatte");
    return out << '}';
}

std::ostream& operator<<(std::ostream& out, const SY_LightDesc& l) {
    out << "light{id=" << l.id << " type=";
    if (const char* name = LightTypeName(l.type))
        out << name;
    else
        out << l.type;
    out << " color=(" << l.color[0] << ',' << l.color[1] << ',' << l.color[2] << ',' << l.color[3]
        << ") cone=" << l.coneHalfAngle << '/' << l.coneFeather << " falloff=" << l.falloffType
        << '/' << l.falloffRadius << '/' << l.falloffDistance
        << " placements=" << l.placements.Count();
    if (l.castsShadows) {
        out << " castsShadows darkness=" << l.shadowDarkness << " diffusion=" << l.shadowDiffusion
            << " mapSize=" << l.shadowMapSize;
    }
    return out << '}';
}

std::ostream& operator<<(std::ostream& out, const SY_CameraDOFDesc& d) {
    if (!d.enabled) return out << "dof{off}";
    return out << "dof{zoom=" << d.zoom << " focusDistance=" << d.focusDistance
               << " aperture=" << d.aperture << " blurLevel=" << d.blurLevel
               << " downsample=" << d.downsampleX << 'x' << d.downsampleY
               << " pixelAspect=" << d.pixelAspect << " iris=" << d.irisShape << '/'
               << d.irisRotation << '/' << d.irisRoundness << '/' << d.irisAspect
               << " diffractionFringe=" << d.diffractionFringe << " highlight=" << d.highlightGain
               << '/' << d.highlightThreshold << '/' << d.highlightSaturation << '}';
}

std::ostream& operator<<(std::ostream& out, const SY_SceneDesc& s) {
    out << "scene{" << (s.perspective ? "perspective" : "orthographic")
        << " cameraPlacements=" << s.cameraPlacements.Count() << " pixelAspect=" << s.pixelAspect
        << " downsample=" << s.downsampleX << 'x' << s.downsampleY << " fieldMode=" << s.fieldMode
        << ' ' << s.dof;
    Switch(out, s.lightsEnabled, "lightsEnabled");
    out << " layers=" << s.layers.Count() << " lights=" << s.lights.Count() << '}';
    for (const SY_LayerDesc& layer : s.layers)
        out << "\n  " << layer;
    for (const SY_LightDesc& light : s.lights)
        out << "\n  " << light;
    return out;
}
