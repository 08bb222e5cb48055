// The host's plug-in interface: suites acquired by name and version through the basic suite,
// and the artisan entry points a renderer registers. Every operation returns 0 or an error
// code and gives its results through out-parameters.
#pragma once

#include <cstdint>

#include "m_matrix.h"
#include "pf_iterate.h"
#include "pf_world.h"
#include "pf_xfer.h"
#include "t_time.h"

// Opaque handles of host objects; only the host looks inside.
using QNGP_CompH = struct QNGP_Comp*;
using QNGP_ItemH = struct QNGP_Item*;
using QNGP_LayerH = struct QNGP_Layer*;
using QNGP_RenderContextH = struct QNGP_RenderContext*;
using QNGP_LayerContextH = struct QNGP_LayerContext*;
using QNGP_MemHandle = struct QNGP_Memory*;
using QNGP_PersistentBlobH = struct QNGP_PersistentBlob*;
using QNGP_HostHandle = void*;  // any other host handle an entry point receives

// Error codes the host's suites answer with (0 is success; memory the host cannot have is
// kU_ErrOutOfMemory). A plug-in hands any of them back unchanged from the entry point.
inline constexpr int32_t kQNGP_ErrMissingSuite = 0x13A80001;  // no suite of that name and version
inline constexpr int32_t kQNGP_ErrBadHandle = 0x13A80020;     // a null or foreign handle
inline constexpr int32_t kQNGP_ErrBadIndex = 0x13A80021;      // an index past the end of a list
inline constexpr int32_t kQNGP_ErrBadArgument = 0x13A80022;   // a null out-pointer or unknown mode
inline constexpr int32_t kQNGP_ErrNoSuchStream = 0x13A80023;  // a stream the layer does not have
inline constexpr int32_t kQNGP_ErrWrongLayerKind = 0x13A80024;  // a camera call on a non-camera, …
inline constexpr int32_t kQNGP_ErrHostFailure = 0x13A80025;     // the host could not deliver
inline constexpr int32_t kQNGP_ErrUserCancel = 0x13A80026;      // the user interrupted the render

// The suite through which every other suite is acquired and released.
struct QNGP_BasicSuite {
    int32_t (*AcquireSuite)(const char* name, int32_t version, const void** suite);
    int32_t (*ReleaseSuite)(const char* name, int32_t version);
};

// What the host hands every entry point first.
struct QNGP_InData {
    const QNGP_BasicSuite* basic;
    int32_t pluginId;
};

// An exact ratio, such as a pixel aspect.
struct QNGP_Ratio {
    int32_t num, den;
};

// ---- "QNGP Register Suite" 6 ------------------------------------------------------------

// A version as major and minor number.
struct QNGP_Version16 {
    int16_t major, minor;
};

// The entry points an artisan registers: about box, instance life, options dialog, render.
using QNGP_AboutEntry = int32_t (*)(const QNGP_InData* in);
using QNGP_InstanceSetUpEntry = int32_t (*)(const QNGP_InData* in, QNGP_HostHandle, QNGP_HostHandle,
                                            QNGP_HostHandle, QNGP_HostHandle,
                                            QNGP_MemHandle flattened, QNGP_MemHandle* options);
using QNGP_InstanceSetDownEntry = int32_t (*)(const QNGP_InData* in, QNGP_HostHandle,
                                              QNGP_HostHandle, QNGP_HostHandle,
                                              QNGP_MemHandle options);
using QNGP_FlattenEntry = int32_t (*)(const QNGP_InData* in, QNGP_HostHandle, QNGP_HostHandle,
                                      QNGP_HostHandle, QNGP_MemHandle options,
                                      QNGP_MemHandle* flattened);
using QNGP_InstanceDialogEntry = int32_t (*)(const QNGP_InData* in, QNGP_HostHandle,
                                             QNGP_HostHandle, QNGP_HostHandle,
                                             QNGP_MemHandle options, int32_t* changed);
// The six handles after the in-data: the third is the render context, the fifth the options.
using QNGP_RenderEntry = int32_t (*)(const QNGP_InData* in, QNGP_HostHandle, QNGP_HostHandle,
                                     QNGP_RenderContextH renderContext, QNGP_HostHandle,
                                     QNGP_MemHandle options, QNGP_HostHandle);

// The eleven slots an artisan fills; the unused ones stay null.
struct QNGP_ArtisanEntryPoints {
    void* slot0;
    void* slot1;
    QNGP_AboutEntry about;
    QNGP_InstanceSetUpEntry instanceSetUp;
    QNGP_InstanceSetDownEntry instanceSetDown;
    QNGP_FlattenEntry flattenInstance;
    QNGP_InstanceDialogEntry instanceDialog;
    void* slot7;
    QNGP_RenderEntry render;
    void* slot9;
    void* slot10;
};

// Called once when the host unloads the plug-in.
using QNGP_DeathHook = int32_t (*)(int32_t pluginId, int64_t reference);

// Registers the artisan and its death hook, from the plug-in's main entry.
struct QNGP_RegisterSuite6 {
    int32_t (*RegisterArtisan)(QNGP_Version16 api, QNGP_Version16 artisan, int32_t pluginId,
                               int64_t reference, const char* matchName, const char* displayName,
                               const QNGP_ArtisanEntryPoints* entries);
    int32_t (*RegisterDeathHook)(int32_t pluginId, QNGP_DeathHook hook, int64_t reference);
};

// ---- "QNGP Memory Suite" 1 --------------------------------------------------------------

// Relocatable memory the host keeps, such as an instance's options.
struct QNGP_MemorySuite1 {
    int32_t (*NewHandle)(int32_t pluginId, const char* name, uint32_t size, int32_t flags,
                         QNGP_MemHandle* handle);
    int32_t (*FreeHandle)(QNGP_MemHandle handle);
    int32_t (*LockHandle)(QNGP_MemHandle handle, void** pointer);
    int32_t (*UnlockHandle)(QNGP_MemHandle handle);
    int32_t (*GetHandleSize)(QNGP_MemHandle handle, uint32_t* size);
};

// ---- "QNGP Persistent Data Suite" 3 -----------------------------------------------------

// The application's settings, by section and key.
struct QNGP_PersistentDataSuite3 {
    int32_t (*GetApplicationBlob)(QNGP_PersistentBlobH* blob);
    int32_t (*GetLong)(QNGP_PersistentBlobH blob, const char* section, const char* key,
                       int32_t defaultValue, int32_t* value);
};

// ---- "QNGP Canvas Suite" 10 and 13 ------------------------------------------------------

// A rectangle as the canvas reports it: top, left, bottom, right.
struct QNGP_ShortRect {
    int16_t top, left, bottom, right;
};

// Render modes of RenderLayer: the matte layer as it is, or the layer itself at its own size.
inline constexpr int32_t kQNGP_RenderMatte = 0;
inline constexpr int32_t kQNGP_RenderWholeLayer = 2;

// What the host tells an artisan about the frame it renders and its layers.
struct QNGP_CanvasSuite10 {
    int32_t (*GetCompToRender)(QNGP_RenderContextH context, QNGP_CompH* comp);
    int32_t (*GetRenderTime)(QNGP_RenderContextH context, T_Time* time, T_Time* timeStep);
    int32_t (*GetCompDestination)(QNGP_RenderContextH context, QNGP_CompH comp, PF_World** world);
    int32_t (*GetDownsample)(QNGP_RenderContextH context, int16_t* dx, int16_t* dy);
    int32_t (*GetRegionOfInterest)(QNGP_RenderContextH context, QNGP_ShortRect* region);
    int32_t (*GetFieldRender)(QNGP_RenderContextH context, int32_t* fieldMode);
    int32_t (*GetNumLayersToRender)(QNGP_RenderContextH context, int32_t* count);
    int32_t (*GetNthLayerContext)(QNGP_RenderContextH context, int32_t index,
                                  QNGP_LayerContextH* layerContext);
    int32_t (*GetLayerFromLayerContext)(QNGP_RenderContextH context,
                                        QNGP_LayerContextH layerContext, QNGP_LayerH* layer);
    int32_t (*GetTopLevelLayer)(QNGP_RenderContextH context, QNGP_LayerContextH layerContext,
                                QNGP_LayerH* layer);
    int32_t (*GetRenderLayerToWorldXform)(QNGP_RenderContextH context,
                                          QNGP_LayerContextH layerContext, const T_Time* time,
                                          M_Matrix4* transform);
    int32_t (*GetRenderLayerBounds)(QNGP_RenderContextH context, QNGP_LayerContextH layerContext,
                                    const T_Time* time, QNGP_ShortRect* bounds);
    int32_t (*GetRenderOpacity)(QNGP_RenderContextH context, QNGP_LayerContextH layerContext,
                                const T_Time* time, double* opacity);
    int32_t (*IsLayerUnbounded)(QNGP_RenderContextH context, QNGP_LayerContextH layerContext,
                                bool* unbounded);
    // Renders a layer into a new world that the caller owns and deletes.
    int32_t (*RenderLayer)(QNGP_RenderContextH context, QNGP_LayerH layer,
                           QNGP_LayerContextH layerContext, int32_t mode, PF_World** world);
    // Renders a layer's texture at a size chosen from the hints (average screen scale,
    // layer-pixel rectangle; either may be null); sourceMatrix maps layer pixels to texture
    // pixels. The world stays the host's until DisposeTexture.
    int32_t (*RenderTexture)(QNGP_RenderContextH context, QNGP_LayerContextH layerContext,
                             int32_t hints, const double* scaleHint, const M_LRect* rectHint,
                             M_Matrix3* sourceMatrix, PF_World** world);
    int32_t (*DisposeTexture)(QNGP_RenderContextH context, QNGP_LayerContextH layerContext,
                              PF_World* world);
    // The layer context of a layer's track matte, or null when it has none.
    int32_t (*GetTrackMatteContext)(QNGP_RenderContextH context, QNGP_LayerContextH layerContext,
                                    QNGP_LayerContextH* matteContext);
    // Progress: renderables drawn so far, then rows of the current renderable. A non-zero
    // result is the user's cancel.
    int32_t (*ReportRenderProgress)(QNGP_RenderContextH context, int32_t count, int32_t total);
    int32_t (*ReportRowProgress)(QNGP_RenderContextH context, int32_t count, int32_t total);
};

// Adds the comp's shutter interval.
struct QNGP_CanvasSuite13 : QNGP_CanvasSuite10 {
    int32_t (*GetShutterInterval)(QNGP_RenderContextH context, T_Time* start, T_Time* duration);
};

// ---- "QNGP Comp Suite" 9 and 14 ---------------------------------------------------------

// Comp flag bits: motion blur is on; lights and depth of field are switched off.
inline constexpr int32_t kQNGP_CompFlagMotionBlur = 0x8;
inline constexpr int32_t kQNGP_CompFlagNoLightsOrDepthOfField = 0x100;

// A comp's flags and the item that holds it.
struct QNGP_CompSuite9 {
    int32_t (*GetCompFlags)(QNGP_CompH comp, int32_t* flags);
    int32_t (*GetItemFromComp)(QNGP_CompH comp, QNGP_ItemH* item);
};

// Adds the comp's motion-blur sample count.
struct QNGP_CompSuite14 : QNGP_CompSuite9 {
    int32_t (*GetCompMotionBlurSamples)(QNGP_CompH comp, int32_t* samples);
};

// ---- "QNGP Item Suite" 7 ----------------------------------------------------------------

// An item's pixel aspect and size.
struct QNGP_ItemSuite7 {
    int32_t (*GetItemPixelAspectRatio)(QNGP_ItemH item, QNGP_Ratio* ratio);
    int32_t (*GetItemDimensions)(QNGP_ItemH item, int32_t* width, int32_t* height);
};

// ---- "QNGP Camera Suite" 2 and "QNGP Light Suite" 1 -------------------------------------

// Camera types.
inline constexpr int32_t kQNGP_CameraPerspective = 0;
inline constexpr int32_t kQNGP_CameraOrthographic = 1;

// The comp's camera.
struct QNGP_CameraSuite2 {
    // The comp's camera at that time, or null when it has none.
    int32_t (*GetCamera)(QNGP_RenderContextH context, const T_Time* time, QNGP_LayerH* camera);
    int32_t (*GetCameraType)(QNGP_LayerH camera, int32_t* type);
    int32_t (*GetDefaultCameraDistanceToImagePlane)(QNGP_CompH comp, double* distance);
};

// Light types as GetLightType reports them.
inline constexpr int32_t kQNGP_LightParallel = 0;
inline constexpr int32_t kQNGP_LightSpot = 1;
inline constexpr int32_t kQNGP_LightPoint = 2;
inline constexpr int32_t kQNGP_LightAmbient = 3;

// A light layer's type.
struct QNGP_LightSuite1 {
    int32_t (*GetLightType)(QNGP_LayerH light, int32_t* type);
};

// ---- "QNGP Layer Suite" 10 --------------------------------------------------------------

// Layer flag bits. On a light the adjustment switch limits its light to the layers below it.
inline constexpr int32_t kQNGP_LayerFlagMotionBlur = 0x8;
inline constexpr int32_t kQNGP_LayerFlagCollapse = 0x80;
inline constexpr int32_t kQNGP_LayerFlagAdjustment = 0x200;

// Layer object types: image, solid and null layers are visual.
inline constexpr int32_t kQNGP_ObjectTypeVisual = 0;
inline constexpr int32_t kQNGP_ObjectTypeLight = 1;
inline constexpr int32_t kQNGP_ObjectTypeCamera = 2;

// Layer quality as GetLayerQuality reports it.
inline constexpr int16_t kQNGP_QualityWireframe = 0;
inline constexpr int16_t kQNGP_QualityDraft = 1;
inline constexpr int16_t kQNGP_QualityBest = 2;

// Texture sampling filter of an engine layer at best quality.
inline constexpr uint8_t kQNGP_SamplingNearest = 0;
inline constexpr uint8_t kQNGP_SamplingBilinear = 1;
inline constexpr uint8_t kQNGP_SamplingBicubic = 2;

// Transfer flag: keep the alpha of what lies below.
inline constexpr int32_t kQNGP_TransferPreserveAlpha = 0x1;

// How a layer uses the layer above it as its track matte.
inline constexpr int32_t kQNGP_TrackMatteNone = 0;
inline constexpr int32_t kQNGP_TrackMatteAlpha = 1;
inline constexpr int32_t kQNGP_TrackMatteInvertedAlpha = 2;
inline constexpr int32_t kQNGP_TrackMatteLuma = 3;
inline constexpr int32_t kQNGP_TrackMatteInvertedLuma = 4;

// A layer's transfer mode, its kQNGP_Transfer… flags and its kQNGP_TrackMatte… type.
struct QNGP_LayerTransferMode {
    int32_t mode;
    int32_t flags;
    int32_t trackMatte;
};

// The values of a layer's casts-shadows and accepts-shadows streams.
inline constexpr int32_t kQNGP_ShadowsOff = 0;
inline constexpr int32_t kQNGP_ShadowsOn = 1;
inline constexpr int32_t kQNGP_ShadowsOnly = 2;  // casting: the layer itself is not drawn

// The host engine's view of a layer: whether it is an audio/visual layer, and that layer's
// answers to the two queries the renderer makes (it ignores the keep-alpha flag; its texture
// sampling filter, one of kQNGP_Sampling…).
struct QNGP_EngineLayer {
    bool isAVLayer;
    bool ignoresPreserveAlpha;
    uint8_t samplingFilter;
};

// A comp's layers and each layer's switches, transfer mode and placement.
struct QNGP_LayerSuite10 {
    int32_t (*GetCompNumLayers)(QNGP_CompH comp, int32_t* count);
    int32_t (*GetCompLayerByIndex)(QNGP_CompH comp, int32_t index, QNGP_LayerH* layer);
    int32_t (*GetLayerIndex)(QNGP_LayerH layer, int32_t* index);
    int32_t (*GetLayerFlags)(QNGP_LayerH layer, int32_t* flags);
    int32_t (*GetLayerObjectType)(QNGP_LayerH layer, int32_t* type);
    int32_t (*IsLayerActive)(QNGP_LayerH layer, const T_Time* time, bool* active);
    int32_t (*GetLayerQuality)(QNGP_LayerH layer, int16_t* quality);
    int32_t (*GetLayerTransferMode)(QNGP_LayerH layer, QNGP_LayerTransferMode* mode);
    int32_t (*LayerHasTrackMatte)(QNGP_LayerH layer, bool* hasMatte);
    int32_t (*GetLayerToWorldXform)(QNGP_LayerH layer, const T_Time* time, M_Matrix4* transform);
    int32_t (*GetEngineLayer)(QNGP_LayerH layer, QNGP_EngineLayer* engine);
};

// ---- "QNGP Stream Suite" 7 --------------------------------------------------------------

// Time mode of a stream query: the time is in the layer's own time.
inline constexpr int32_t kQNGP_TimeModeLayer = 1;

// Layer streams by number. Units are the host's: percent, degrees or pixels as noted.
enum QNGP_Stream : int32_t {
    // Transform, on every layer (anchor point, scale and opacity only on layers with pixels
    // and nulls).
    kQNGP_StreamAnchorPoint = 0,
    kQNGP_StreamPosition = 1,
    kQNGP_StreamScale = 2,        // x, y, z; percent
    kQNGP_StreamOrientation = 3,  // degrees
    kQNGP_StreamRotationX = 4,
    kQNGP_StreamRotationY = 5,
    kQNGP_StreamRotationZ = 6,
    kQNGP_StreamOpacity = 7,  // percent
    kQNGP_StreamPointOfInterest = 8,
    // Camera.
    kQNGP_StreamZoom = 11,          // pixels
    kQNGP_StreamDepthOfField = 12,  // 0 or 1
    kQNGP_StreamFocusDistance = 13,
    kQNGP_StreamAperture = 14,
    kQNGP_StreamBlurLevel = 15,  // percent
    // Light.
    kQNGP_StreamIntensity = 16,        // percent
    kQNGP_StreamColor = 17,            // alpha 1, red, green, blue
    kQNGP_StreamConeAngle = 18,        // degrees
    kQNGP_StreamConeFeather = 19,      // percent
    kQNGP_StreamShadowDarkness = 20,   // percent
    kQNGP_StreamShadowDiffusion = 21,  // pixels
    // Material, on image and solid layers.
    kQNGP_StreamAcceptsShadows = 22,  // a kQNGP_Shadows… value
    kQNGP_StreamAcceptsLights = 23,   // 0 or 1
    kQNGP_StreamAmbient = 24,         // percent, like the two after it
    kQNGP_StreamDiffuse = 25,
    kQNGP_StreamSpecularIntensity = 26,
    kQNGP_StreamShininess = 27,          // percent
    kQNGP_StreamCastsShadows = 28,       // layers: a kQNGP_Shadows… value; lights: 0 or 1
    kQNGP_StreamLightTransmission = 29,  // percent
    kQNGP_StreamMetal = 30,              // percent
    // Camera iris and highlights.
    kQNGP_StreamIrisShape = 32,      // 1 fast rectangle, 3 and up the sides of a polygon
    kQNGP_StreamIrisRotation = 33,   // degrees
    kQNGP_StreamIrisRoundness = 34,  // percent
    kQNGP_StreamIrisAspect = 35,
    kQNGP_StreamDiffractionFringe = 36,    // percent
    kQNGP_StreamHighlightGain = 37,        // percent
    kQNGP_StreamHighlightThreshold = 38,   // 8-bit levels
    kQNGP_StreamHighlightSaturation = 39,  // percent
    // Light falloff.
    kQNGP_StreamFalloff = 40,          // 1 none, 2 smooth, 3 inverse square
    kQNGP_StreamFalloffRadius = 41,    // pixels
    kQNGP_StreamFalloffDistance = 42,  // pixels
};

// A stream's value: one number in v[0], a pair in v[0..1], a colour as alpha, red, green, blue.
struct QNGP_StreamValue {
    double v[4];
};

// A layer's stream values over time.
struct QNGP_StreamSuite7 {
    int32_t (*GetLayerStreamValue)(QNGP_LayerH layer, int32_t stream, int32_t timeMode,
                                   const T_Time* time, int32_t flags, QNGP_StreamValue* value);
};

// ---- "PF Color Settings Suite" 1 and "QN ZEL Suite" 1 -----------------------------------

// How the frame blends: linear light or not.
struct PF_ColorSettingsSuite1 {
    // The frame's colour settings, passed unchanged to the renderer: the frame's blending
    // tables, or null when blending is not linear.
    int32_t (*GetColorSettings)(QNGP_RenderContextH context,
                                const PF_LinearBlendingTables** settings);
};

// The UI framework's drawing resources and nodes (zel_ui.h).
struct UI_DrawingSupplier;
class UI_Node;

// What a dialog needs from the host's UI framework.
struct QN_ZELSuite1 {
    int32_t (*GetDrawingSupplier)(UI_DrawingSupplier** supplier);
    int32_t (*GetParentNode)(UI_Node** node);
};

// Suite names and versions, as the host lists them.
inline constexpr char kQNGP_RegisterSuite[] = "QNGP Register Suite";
inline constexpr char kQNGP_MemorySuite[] = "QNGP Memory Suite";
inline constexpr char kQNGP_PersistentDataSuite[] = "QNGP Persistent Data Suite";
inline constexpr char kQNGP_IterateSuite[] = "QNGP Iterate Suite";
inline constexpr char kQNGP_CanvasSuite[] = "QNGP Canvas Suite";
inline constexpr char kQNGP_CompSuite[] = "QNGP Comp Suite";
inline constexpr char kQNGP_ItemSuite[] = "QNGP Item Suite";
inline constexpr char kQNGP_CameraSuite[] = "QNGP Camera Suite";
inline constexpr char kQNGP_LightSuite[] = "QNGP Light Suite";
inline constexpr char kQNGP_LayerSuite[] = "QNGP Layer Suite";
inline constexpr char kQNGP_StreamSuite[] = "QNGP Stream Suite";
inline constexpr char kPF_ColorSettingsSuite[] = "PF Color Settings Suite";
inline constexpr char kQN_ZELSuite[] = "QN ZEL Suite";

// The plug-in's exported entry: (basic suite, host major and minor version, plug-in id, out
// global reference).
using QNGP_PluginMain = int32_t (*)(const QNGP_BasicSuite* basic, int32_t hostMajor,
                                    int32_t hostMinor, int32_t pluginId, int64_t* global);
