#include "composition/composition_loader.h"

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <cmath>
#include <cstring>
#include <fstream>
#include <sstream>

#include "composition/image_file.h"
#include "composition/json_reader.h"
#include "composition/renderer_options.h"
#include "composition/transform.h"

namespace ostrel {
namespace {

// Larger sides are typing mistakes rather than compositions; the limit also keeps every
// rectangle within the 16-bit integers of the host's layer bounds.
constexpr int32_t kMaxSide = 30000;
// Positions and distances beyond a billion pixels are mistakes too.
constexpr double kFar = 1e9;

const Range kCoordinate = Range::Between(-kFar, kFar);
const Range kPercent = Range::Between(0, 100);
const Range kDistance = Range::Between(0, kFar);

// Layer keys by the kinds of layer they belong to, for "does not apply" messages.
constexpr std::string_view kLayerKeys[] = {
    "source",     "quality",  "sampling", "transferMode", "preserveTransparency",
    "trackMatte", "collapse", "material", "camera",       "light"};
constexpr std::string_view kPixelTransformKeys[] = {"anchorPoint", "scale", "opacity"};

std::string KindText(LayerKind kind) {
    switch (kind) {
        case LayerKind::kImage:
            return "an image layer";
        case LayerKind::kSolid:
            return "a solid layer";
        case LayerKind::kNull:
            return "a null layer";
        case LayerKind::kCamera:
            return "a camera layer";
        case LayerKind::kLight:
            return "a light layer";
    }
    return {};
}

// A layer as read, before names become indices.
struct PendingLayer {
    Layer layer;
    std::string parent;
    std::string matte;
};

class Loader {
public:
    explicit Loader(const std::filesystem::path& file) : file_(file) { c_.file = file.string(); }

    Composition Load(std::string_view text);

private:
    Json Parse(std::string_view text) const;
    void ReadComp(ObjectReader& r);
    FrameRate ReadFrameRate(ObjectReader& r);
    std::vector<uint8_t> ReadHexBytes(ObjectReader& r, std::string_view key);
    void ReadRendererOptions(ObjectReader& r);
    PendingLayer ReadLayer(const Json& node, size_t index);
    void ReadSource(ObjectReader& r, Layer& layer);
    void ReadTransform(ObjectReader r, Layer& layer, const Vec<3>& position);
    void ReadTrackMatte(ObjectReader& r, PendingLayer& pending);
    void ReadMaterial(ObjectReader r, Material& m);
    void ReadCamera(ObjectReader r, Layer& layer);
    void ReadLight(ObjectReader r, Layer& layer);
    void Resolve(std::vector<PendingLayer>& pending);
    void CheckParentChains() const;
    std::string LayerPlace(size_t index, std::string_view key) const {
        return PlaceOf(PlaceOf("layers", index), key);
    }
    Vec<3> CompCentre() const { return {comp_.width * 0.5, comp_.height * 0.5, 0.0}; }

    std::filesystem::path file_;
    JsonContext c_;
    Composition comp_;
};

Composition Loader::Load(std::string_view text) {
    Json root = Parse(text);
    comp_.file = file_;
    ObjectReader r(c_, &root, "");
    ReadComp(r);
    const Json* layers = r.Find("layers");
    std::vector<PendingLayer> pending;
    if (layers) {
        if (!layers->is_array()) c_.Fail("layers", "expected an array of layers");
        for (size_t i = 0; i < layers->size(); ++i)
            pending.push_back(ReadLayer((*layers)[i], i));
    }
    r.Finish();
    Resolve(pending);
    return std::move(comp_);
}

Json Loader::Parse(std::string_view text) const {
    try {
        return Json::parse(text);
    } catch (const Json::parse_error& e) {
        // The library counts columns after its look-ahead, which can put the place on the
        // next line; the byte offset of the last character read is exact.
        // A newline read last still belongs to the line it ends.
        size_t last = std::min<size_t>(e.byte, text.size());
        last = last == 0 ? 0 : last - 1;
        size_t before = last == 0 ? std::string_view::npos : text.rfind('\n', last - 1);
        size_t lineStart = before == std::string_view::npos ? 0 : before + 1;
        size_t line =
            1 + static_cast<size_t>(std::count(text.begin(), text.begin() + lineStart, '\n'));
        // The library's text reads "[json.exception.parse_error.101] parse error at line 3,
        // column 7: syntax error ..."; keep what follows the place.
        std::string what = e.what();
        size_t problem = what.find(": ", what.find("column"));
        c_.Fail("", "malformed JSON: line " + std::to_string(line) + ", column " +
                        std::to_string(last - lineStart + 1) + ": " +
                        (problem == std::string::npos ? what : what.substr(problem + 2)));
    } catch (const Json::exception& e) {
        // Numbers beyond the range of a double (1e999) end up here.
        std::string what = e.what();
        size_t problem = what.find("] ");
        c_.Fail("", "malformed JSON: " +
                        (problem == std::string::npos ? what : what.substr(problem + 2)));
    }
}

void Loader::ReadComp(ObjectReader& r) {
    comp_.width = ReadInteger(c_, r.Require("width"), "width", 1, kMaxSide);
    comp_.height = ReadInteger(c_, r.Require("height"), "height", 1, kMaxSide);
    comp_.pixelAspect = r.Number("pixelAspect", comp_.pixelAspect, Range::Between(0.1, 10));
    comp_.frameRate = ReadFrameRate(r);
    comp_.duration = ReadNumber(c_, r.Require("duration"), "duration", Range::Positive(86400));
    comp_.bitDepth = static_cast<int16_t>(r.Integer("bitDepth", comp_.bitDepth, 8, 32));
    if (comp_.bitDepth != 8 && comp_.bitDepth != 16 && comp_.bitDepth != 32) {
        r.Fail("bitDepth", "must be 8, 16 or 32, got " + std::to_string(comp_.bitDepth));
    }
    const Json* background = r.Find("background");
    if (background) {
        comp_.background =
            ReadVec<3>(c_, *background, "background", {}, Range::Between(0, 1), true);
    }

    comp_.renderBackground = r.Bool("renderBackground", comp_.renderBackground);

    ObjectReader blur = r.Object("motionBlur");
    comp_.motionBlur.enabled = blur.Bool("enabled", comp_.motionBlur.enabled);
    comp_.motionBlur.samplesPerFrame =
        blur.Integer("samplesPerFrame", comp_.motionBlur.samplesPerFrame, 1, 64);
    comp_.motionBlur.shutterAngle =
        blur.Integer("shutterAngle", comp_.motionBlur.shutterAngle, 0, 720);
    comp_.motionBlur.shutterPhase =
        blur.Integer("shutterPhase", comp_.motionBlur.shutterPhase, -360, 360);
    blur.Finish();

    comp_.lightsAndDepthOfField = r.Bool("lightsAndDepthOfField", comp_.lightsAndDepthOfField);
    ObjectReader blending = r.Object("blending");
    comp_.blending.linear = blending.Bool("linear", comp_.blending.linear);
    comp_.blending.gamma = blending.Number("gamma", comp_.blending.gamma, Range::Between(0.1, 10));
    blending.Finish();
    ReadRendererOptions(r);
}

void Loader::ReadRendererOptions(ObjectReader& r) {
    bool flattenedGiven = r.Has("rendererOptions");
    comp_.rendererOptions = ReadHexBytes(r, "rendererOptions");
    ObjectReader renderer = r.Object("renderer");
    if (const Json* size = renderer.Find("shadowMapSize")) {
        if (flattenedGiven) {
            renderer.Fail("shadowMapSize",
                          "the renderer's options are given twice; keep this or rendererOptions");
        }
        std::string allowed = "\"Comp Size\"";
        for (size_t choice = 1; choice < kShadowMapSizes.size(); ++choice)
            allowed += ", " + std::to_string(kShadowMapSizes[choice]);
        int32_t chosen = -1;
        for (size_t choice = 0; choice < kShadowMapSizes.size(); ++choice) {
            bool match = choice == 0 ? *size == "Comp Size"
                                     : size->is_number() && *size == kShadowMapSizes[choice];
            if (match) chosen = static_cast<int32_t>(choice);
        }
        if (chosen < 0) {
            std::string given = size->is_string()       ? QuoteUserText(size->get<std::string>())
                                : size->is_structured() ? std::string("an ") + size->type_name()
                                                        : size->dump();
            renderer.Fail("shadowMapSize", "got " + given + "; the renderer offers " + allowed);
        }
        comp_.rendererOptions = FlattenedRendererOptions(chosen);
    }
    renderer.Finish();
}

FrameRate Loader::ReadFrameRate(ObjectReader& r) {
    const Json* j = r.Find("frameRate");
    if (!j) return {};
    std::string place = r.PlaceOf("frameRate");
    FrameRate rate;
    if (j->is_array()) {
        if (j->size() != 2) c_.Fail(place, "expected [numerator, denominator]");
        rate.numerator = ReadInteger(c_, (*j)[0], PlaceOf(place, 0), 1, 1000000);
        rate.denominator = ReadInteger(c_, (*j)[1], PlaceOf(place, 1), 1, 1000000);
        if (rate.numerator > 1000 * rate.denominator) {
            c_.Fail(place, "must be at most 1000 frames per second");
        }
        return rate;
    }
    double fps = ReadNumber(c_, *j, place, Range::Positive(1000));
    if (fps != std::floor(fps)) {
        c_.Fail(place, "give a fractional rate as [numerator, denominator], such as [24000, 1001]");
    }
    rate.numerator = static_cast<int32_t>(fps);
    return rate;
}

std::vector<uint8_t> Loader::ReadHexBytes(ObjectReader& r, std::string_view key) {
    std::string text = r.String(key, "");
    std::vector<uint8_t> bytes;
    auto digit = [](char ch) { return std::isxdigit(static_cast<unsigned char>(ch)) != 0; };
    if (text.size() % 2 != 0 || !std::all_of(text.begin(), text.end(), digit)) {
        r.Fail(key, "expected an even number of hexadecimal digits");
    }
    for (size_t i = 0; i < text.size(); i += 2) {
        bytes.push_back(static_cast<uint8_t>(std::stoi(text.substr(i, 2), nullptr, 16)));
    }
    return bytes;
}

PendingLayer Loader::ReadLayer(const Json& node, size_t index) {
    ObjectReader r(c_, &node, PlaceOf("layers", index));
    PendingLayer pending;
    Layer& layer = pending.layer;
    layer.name = r.String("name", "layer " + std::to_string(index + 1));
    if (layer.name.empty()) r.Fail("name", "must not be empty");
    layer.kind = r.ChoiceOf<LayerKind>(r.Require("kind"), r.PlaceOf("kind"),
                                       {{"image", LayerKind::kImage},
                                        {"solid", LayerKind::kSolid},
                                        {"null", LayerKind::kNull},
                                        {"camera", LayerKind::kCamera},
                                        {"light", LayerKind::kLight}});
    layer.inPoint = r.Number("in", layer.inPoint, Range::Between(-86400, 86400));
    layer.outPoint = r.Number("out", comp_.duration, Range::Between(-86400, 86400));
    if (layer.outPoint <= layer.inPoint) r.Fail("out", "must be after the in time");
    layer.on = r.Bool("on", layer.on);
    layer.threeD = r.Bool("threeD", layer.threeD);
    pending.parent = r.String("parent", "");
    layer.motionBlur = r.Bool("motionBlur", layer.motionBlur);

    Vec<3> position = CompCentre();
    if (layer.HasPixels()) {
        ReadSource(r, layer);
        layer.quality = r.Choice("quality", layer.quality,
                                 {{"wireframe", Quality::kWireframe},
                                  {"draft", Quality::kDraft},
                                  {"best", Quality::kBest}});
        layer.sampling =
            r.Choice("sampling", layer.sampling,
                     {{"bilinear", Sampling::kBilinear}, {"bicubic", Sampling::kBicubic}});
        // The pixel library's mode table judges the name; here it only has to look like one.
        layer.transferMode = r.String("transferMode", "normal");
        bool identifier =
            !layer.transferMode.empty() &&
            std::islower(static_cast<unsigned char>(layer.transferMode[0])) &&
            std::all_of(layer.transferMode.begin(), layer.transferMode.end(), [](char ch) {
                return std::islower(static_cast<unsigned char>(ch)) ||
                       std::isdigit(static_cast<unsigned char>(ch)) || ch == '-';
            });
        if (!identifier) {
            r.Fail("transferMode",
                   "expected a mode name in lower case, such as \"multiply\", got " +
                       QuoteUserText(layer.transferMode));
        }
        layer.preserveTransparency = r.Bool("preserveTransparency", layer.preserveTransparency);
        ReadTrackMatte(r, pending);
        layer.collapse = r.Bool("collapse", layer.collapse);
        ReadMaterial(r.Object("material"), layer.material);
        layer.transform.anchorPoint =
            Vec<3>{layer.source.width * 0.5, layer.source.height * 0.5, 0.0};
    } else if (layer.kind == LayerKind::kCamera) {
        ReadCamera(r.Object("camera"), layer);
        position[2] = -layer.camera.zoom.Keys().front().value[0];
    } else if (layer.kind == LayerKind::kLight) {
        ReadLight(r.Object("light"), layer);
        position[2] = -0.5 * DefaultCameraDistance(comp_);
    }
    ReadTransform(r.Object("transform"), layer, position);
    r.Finish(KindText(layer.kind), kLayerKeys);
    return pending;
}

void Loader::ReadSource(ObjectReader& r, Layer& layer) {
    const Json& source = r.Require("source");
    std::string place = r.PlaceOf("source");
    if (layer.kind == LayerKind::kImage) {
        std::string name = ReadString(c_, source, place);
        if (name.empty()) c_.Fail(place, "expected the path of an image file");
        layer.source.image =
            std::filesystem::absolute(file_.parent_path() / name).lexically_normal();
        ImageInfo info;
        try {
            info = ProbeImage(layer.source.image);
        } catch (const CompositionError& e) {
            c_.Fail(place, e.what());
        }
        if (info.width < 1 || info.height < 1 || info.width > kMaxSide || info.height > kMaxSide) {
            c_.Fail(place, "the image is " + std::to_string(info.width) + " × " +
                               std::to_string(info.height) + " pixels; sides must be 1 to " +
                               std::to_string(kMaxSide));
        }
        layer.source.width = info.width;
        layer.source.height = info.height;
        return;
    }
    ObjectReader solid(c_, &source, place);
    solid.Require("color");
    layer.source.solidColor = ReadVec<3>(c_, *solid.Find("color"), solid.PlaceOf("color"), {},
                                         Range::Between(0, 1), true);
    layer.source.unbounded = solid.Bool("unbounded", false);
    if (layer.source.unbounded) {
        for (std::string_view key : {"width", "height"}) {
            if (solid.Has(key)) solid.Fail(key, "an unbounded solid has no size");
        }
    }
    layer.source.width = solid.Integer("width", comp_.width, 1, kMaxSide);
    layer.source.height = solid.Integer("height", comp_.height, 1, kMaxSide);
    solid.Finish();
}

void Loader::ReadTransform(ObjectReader r, Layer& layer, const Vec<3>& position) {
    Transform& t = layer.transform;
    if (layer.kind != LayerKind::kCamera && layer.kind != LayerKind::kLight) {
        t.anchorPoint = r.Anim("anchorPoint", t.anchorPoint, kCoordinate);
        t.scale = r.Anim("scale", t.scale, Range::Between(-1e6, 1e6));
        t.opacity = r.Anim("opacity", t.opacity, kPercent);
    }
    t.position = r.Anim("position", Vector3(position), kCoordinate);
    t.orientation = r.Anim("orientation", t.orientation, Range::Between(-1e6, 1e6));
    t.rotationX = r.Anim("rotationX", t.rotationX, Range::Between(-1e6, 1e6));
    t.rotationY = r.Anim("rotationY", t.rotationY, Range::Between(-1e6, 1e6));
    t.rotationZ = r.Anim("rotationZ", t.rotationZ, Range::Between(-1e6, 1e6));
    r.Finish(KindText(layer.kind), kPixelTransformKeys);
}

void Loader::ReadTrackMatte(ObjectReader& r, PendingLayer& pending) {
    const Json* j = r.Find("trackMatte");
    if (!j) return;
    Choices<TrackMatte> types = {{"alpha", TrackMatte::kAlpha},
                                 {"alpha-inverted", TrackMatte::kAlphaInverted},
                                 {"luma", TrackMatte::kLuma},
                                 {"luma-inverted", TrackMatte::kLumaInverted}};
    std::string place = r.PlaceOf("trackMatte");
    if (j->is_string()) {
        pending.layer.trackMatte = r.ChoiceOf(*j, place, types);
        return;
    }
    ObjectReader matte(c_, j, place);
    pending.layer.trackMatte = matte.ChoiceOf(matte.Require("type"), matte.PlaceOf("type"), types);
    pending.matte = matte.String("layer", "");
    matte.Finish();
}

void Loader::ReadMaterial(ObjectReader r, Material& m) {
    Choices<ShadowMode> modes = {
        {"off", ShadowMode::kOff}, {"on", ShadowMode::kOn}, {"only", ShadowMode::kOnly}};
    m.castsShadows = r.Choice("castsShadows", m.castsShadows, modes);
    m.acceptsShadows = r.Choice("acceptsShadows", m.acceptsShadows, modes);
    m.acceptsLights = r.Bool("acceptsLights", m.acceptsLights);
    m.ambient = r.Anim("ambient", m.ambient, kPercent);
    m.diffuse = r.Anim("diffuse", m.diffuse, kPercent);
    m.specularIntensity = r.Anim("specularIntensity", m.specularIntensity, kPercent);
    m.shininess = r.Anim("shininess", m.shininess, kPercent);
    m.metal = r.Anim("metal", m.metal, kPercent);
    m.lightTransmission = r.Anim("lightTransmission", m.lightTransmission, kPercent);
    r.Finish();
}

void Loader::ReadCamera(ObjectReader r, Layer& layer) {
    CameraSettings& cam = layer.camera;
    cam.nodes =
        r.Choice("type", cam.nodes,
                 {{"one-node", CameraNodes::kOneNode}, {"two-node", CameraNodes::kTwoNode}});
    cam.orthographic = r.Bool("orthographic", cam.orthographic);
    cam.zoom = r.Anim("zoom", Scalar(Vec<1>{DefaultCameraDistance(comp_)}), Range::Positive(kFar));
    if (cam.nodes == CameraNodes::kTwoNode) {
        layer.hasPointOfInterest = true;
        layer.pointOfInterest = r.Anim("pointOfInterest", Vector3(CompCentre()), kCoordinate);
    } else if (r.Has("pointOfInterest")) {
        r.Fail("pointOfInterest", "a one-node camera has no point of interest");
    }

    ObjectReader d = r.Object("depthOfField");
    DepthOfField& dof = cam.depthOfField;
    dof.enabled = d.Bool("enabled", dof.enabled);
    dof.focusDistance = d.Anim("focusDistance", cam.zoom, Range::Positive(kFar));
    dof.aperture = d.Anim("aperture", dof.aperture, Range::Between(0, 1e5));
    dof.blurLevel = d.Anim("blurLevel", dof.blurLevel, Range::Between(0, 1000));
    dof.irisShape = d.Choice("irisShape", dof.irisShape,
                             {{"fast-rectangle", kIrisFastRectangle},
                              {"triangle", 3},
                              {"square", 4},
                              {"pentagon", 5},
                              {"hexagon", 6},
                              {"heptagon", 7},
                              {"octagon", 8},
                              {"nonagon", 9},
                              {"decagon", 10}});
    dof.irisRotation = d.Anim("irisRotation", dof.irisRotation, Range::Between(-1e6, 1e6));
    dof.irisRoundness = d.Anim("irisRoundness", dof.irisRoundness, kPercent);
    dof.irisAspect = d.Anim("irisAspect", dof.irisAspect, Range::Between(0.01, 100));
    dof.diffractionFringe =
        d.Anim("diffractionFringe", dof.diffractionFringe, Range::Between(0, 1000));
    dof.highlightGain = d.Anim("highlightGain", dof.highlightGain, kPercent);
    dof.highlightThreshold =
        d.Anim("highlightThreshold", dof.highlightThreshold, Range::Between(0, 255));
    dof.highlightSaturation = d.Anim("highlightSaturation", dof.highlightSaturation, kPercent);
    d.Finish();
    r.Finish();
}

void Loader::ReadLight(ObjectReader r, Layer& layer) {
    LightSettings& light = layer.light;
    light.type = r.Choice("type", light.type,
                          {{"parallel", LightType::kParallel},
                           {"spot", LightType::kSpot},
                           {"point", LightType::kPoint},
                           {"ambient", LightType::kAmbient}});
    if (light.type == LightType::kSpot || light.type == LightType::kParallel) {
        layer.hasPointOfInterest = true;
        layer.pointOfInterest = r.Anim("pointOfInterest", Vector3(CompCentre()), kCoordinate);
    } else if (r.Has("pointOfInterest")) {
        r.Fail("pointOfInterest", "only spot and parallel lights aim at a point of interest");
    }
    light.intensity = r.Anim("intensity", light.intensity, Range::Between(-1e5, 1e5));
    light.color = r.Anim("color", light.color, Range::Between(0, 1), true);
    light.coneAngle = r.Anim("coneAngle", light.coneAngle, Range::Between(0, 180));
    light.coneFeather = r.Anim("coneFeather", light.coneFeather, kPercent);
    light.falloff = r.Choice("falloff", light.falloff,
                             {{"none", Falloff::kNone},
                              {"smooth", Falloff::kSmooth},
                              {"inverse-square", Falloff::kInverseSquare}});
    light.radius = r.Anim("radius", light.radius, kDistance);
    light.distance = r.Anim("distance", light.distance, kDistance);
    light.castsShadows = r.Bool("castsShadows", light.castsShadows);
    light.shadowDarkness = r.Anim("shadowDarkness", light.shadowDarkness, kPercent);
    light.shadowDiffusion =
        r.Anim("shadowDiffusion", light.shadowDiffusion, Range::Between(0, 1e4));
    light.lightsOnlyLayersBelow = r.Bool("lightsOnlyLayersBelow", light.lightsOnlyLayersBelow);
    r.Finish();
}

void Loader::Resolve(std::vector<PendingLayer>& pending) {
    for (PendingLayer& p : pending)
        comp_.layers.push_back(p.layer);
    for (size_t i = 0; i < pending.size(); ++i) {
        int32_t first = comp_.LayerIndex(comp_.layers[i].name);
        if (static_cast<size_t>(first) != i) {
            c_.Fail(LayerPlace(i, "name"), "duplicate layer name \"" + comp_.layers[i].name +
                                               "\" (layers[" + std::to_string(first) +
                                               "] has it too)");
        }
    }
    for (size_t i = 0; i < pending.size(); ++i) {
        Layer& layer = comp_.layers[i];
        if (!pending[i].parent.empty()) {
            layer.parent = comp_.LayerIndex(pending[i].parent);
            if (layer.parent < 0) {
                c_.Fail(LayerPlace(i, "parent"), "no layer is named \"" + pending[i].parent + "\"");
            }
        }
        if (layer.trackMatte == TrackMatte::kNone) continue;
        if (pending[i].matte.empty()) {
            if (i == 0) {
                c_.Fail(LayerPlace(i, "trackMatte"),
                        "the top layer has no layer above it to take a matte from");
            }
            layer.matteLayer = static_cast<int32_t>(i - 1);
        } else {
            std::string place = PlaceOf(LayerPlace(i, "trackMatte"), "layer");
            layer.matteLayer = comp_.LayerIndex(pending[i].matte);
            if (layer.matteLayer < 0)
                c_.Fail(place, "no layer is named \"" + pending[i].matte + "\"");
            if (static_cast<size_t>(layer.matteLayer) == i)
                c_.Fail(place, "a layer cannot be its own matte");
        }
        if (!comp_.layers[static_cast<size_t>(layer.matteLayer)].HasPixels()) {
            c_.Fail(LayerPlace(i, "trackMatte"),
                    "layer \"" + comp_.layers[static_cast<size_t>(layer.matteLayer)].name +
                        "\" has no pixels to make a matte from");
        }
    }
    CheckParentChains();
}

void Loader::CheckParentChains() const {
    const std::vector<Layer>& layers = comp_.layers;
    auto parentOf = [&](int32_t at) { return layers[static_cast<size_t>(at)].parent; };
    auto nameOf = [&](int32_t at) -> const std::string& {
        return layers[static_cast<size_t>(at)].name;
    };
    for (size_t i = 0; i < layers.size(); ++i) {
        // A chain without a loop ends within as many steps as there are layers; one that
        // does not end is inside its loop by then.
        int32_t at = static_cast<int32_t>(i);
        for (size_t steps = 0; at >= 0 && steps < layers.size(); ++steps)
            at = parentOf(at);
        if (at < 0) continue;
        std::string chain = nameOf(at);
        for (int32_t p = parentOf(at); p != at; p = parentOf(p))
            chain += " → " + nameOf(p);
        c_.Fail(LayerPlace(static_cast<size_t>(at), "parent"),
                "the parent chain loops: " + chain + " → " + nameOf(at));
    }
}

}  // namespace

Composition ParseComposition(std::string_view text, const std::filesystem::path& file) {
    return Loader(file).Load(text);
}

std::string ReadCompositionText(const std::filesystem::path& file) {
    // A composition is a text file of modest size: a folder, a device or a pipe would hang the
    // read or be reported as malformed JSON.
    constexpr std::uintmax_t kLargest = std::uintmax_t{64} << 20;
    std::error_code error;
    if (std::filesystem::exists(file, error) && !std::filesystem::is_regular_file(file, error))
        throw CompositionError(file.string() + ": not a regular file");
    if (std::filesystem::file_size(file, error) > kLargest && !error)
        throw CompositionError(file.string() + ": larger than 64 MiB, too large for a composition");
    std::ifstream in(file, std::ios::binary);
    if (!in) throw CompositionError(file.string() + ": cannot open: " + std::strerror(errno));
    std::ostringstream text;
    text << in.rdbuf();
    return text.str();
}

Composition LoadComposition(const std::filesystem::path& file) {
    return ParseComposition(ReadCompositionText(file), file);
}

}  // namespace ostrel
