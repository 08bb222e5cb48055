// A composition written in a test, loaded and served for one frame by the host's suites.
#pragma once

#include <memory>
#include <string>
#include <string_view>

#include "composition/composition_loader.h"
#include "session/frame_session.h"
#include "session/frame_suites.h"

namespace ostrel {

// Compositions in tests are 960 × 540 at 24 fps, two seconds long, unless the text says more.
inline std::string CompJson(std::string_view settings, std::string_view layers) {
    std::string text = R"({"width": 960, "height": 540, "duration": 2)";
    if (!settings.empty()) text += ", " + std::string(settings);
    return text + R"(, "layers": [)" + std::string(layers) + "]}";
}

class ServedFrame {
public:
    explicit ServedFrame(const std::string& json, int32_t frame = 0,
                         const RenderSettings& settings = {})
        : comp_(ParseComposition(json, "test.json")),
          session_(std::make_unique<FrameSession>(comp_, images_, settings, frame)) {}

    FrameSession& Session() { return *session_; }
    QNGP_RenderContextH Render() { return session_->RenderContext(); }
    QNGP_LayerH Layer(int32_t index) { return session_->LayerHandle(index); }

private:
    HostSuites suites_;
    Composition comp_;
    ImageCache images_;
    std::unique_ptr<FrameSession> session_;
};

}  // namespace ostrel
