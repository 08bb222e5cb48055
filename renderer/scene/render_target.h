// Where a layer render delivers its pixels. A target is made from the object it draws into and
// is read back only as that object: its kind is its type, so it cannot be taken for another.
#pragma once

#include <cstdint>
#include <type_traits>
#include <utility>
#include <variant>

class PF_World;
class SY_MBuffer;
class SY_ShadowFragmentArray;

// The kinds of target, numbered as the span routines and the frame driver count them.
enum SY_TargetMode : int32_t {
    kSY_TargetDestination = 1,     // composited into the destination world
    kSY_TargetFragmentBuffer = 2,  // added as fragments to an SY_MBuffer
    kSY_TargetDepthOfField = 3,    // stored into the pixels of a depth-of-field buffer
    kSY_TargetShadowArray = 4,     // inserted as occluders into a shadow fragment array
};

// The pixels of a depth-of-field buffer as a target: pixel (x, y) of the frame is stored at
// (x − x0, y − y0) of image, which has the depth of the frame.
struct SY_SpanImageRecord {
    PF_World* image;
    int32_t x0;
    int32_t y0;
};

class SY_RenderTarget {
public:
    explicit SY_RenderTarget(PF_World& destination) : object_(&destination) {}
    explicit SY_RenderTarget(SY_MBuffer& fragments) : object_(&fragments) {}
    explicit SY_RenderTarget(const SY_SpanImageRecord& depthOfField) : object_(depthOfField) {}
    explicit SY_RenderTarget(SY_ShadowFragmentArray& occluders) : object_(&occluders) {}

    SY_TargetMode mode() const { return static_cast<SY_TargetMode>(object_.index() + 1); }

    // Calls the one of cases that takes the target's object (PF_World*, SY_MBuffer*,
    // const SY_SpanImageRecord& or SY_ShadowFragmentArray*) and returns what it returns. Every
    // kind must be served, so a new kind cannot be missed; once per span, never per pixel.
    template <class... Cases>
    decltype(auto) Visit(Cases&&... cases) const {
        struct Overloaded : std::decay_t<Cases>... {
            using std::decay_t<Cases>::operator()...;
        };
        return std::visit(Overloaded{std::forward<Cases>(cases)...}, object_);
    }

private:
    // Alternative i is the object of mode i + 1.
    std::variant<PF_World*, SY_MBuffer*, SY_SpanImageRecord, SY_ShadowFragmentArray*> object_;
};
