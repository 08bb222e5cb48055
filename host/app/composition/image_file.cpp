#include "composition/image_file.h"

#include <OpenImageIO/imageio.h>

#include <algorithm>
#include <string>

#include "composition/composition_error.h"

namespace ostrel {
namespace {

[[noreturn]] void Fail(const std::filesystem::path& file, const std::string& reason) {
    throw CompositionError("cannot read image '" + file.string() + "': " + reason);
}

std::unique_ptr<OIIO::ImageInput> Open(const std::filesystem::path& file) {
    std::error_code error;
    if (!std::filesystem::is_regular_file(file, error))
        Fail(file, std::filesystem::exists(file, error) ? "not a regular file" : "no such file");
    // Ask for colour as stored: readers that can keep alpha unassociated then do so.
    OIIO::ImageSpec config;
    config.attribute("oiio:UnassociatedAlpha", 1);
    auto input = OIIO::ImageInput::open(file.string(), &config);
    if (!input) {
        std::string reason = OIIO::geterror();
        Fail(file, reason.empty() ? "not an image OpenImageIO can read" : reason);
    }
    return input;
}

}  // namespace

ImageInfo ProbeImage(const std::filesystem::path& file) {
    auto input = Open(file);
    const OIIO::ImageSpec& layout = input->spec();
    return {layout.width, layout.height};
}

DecodedImage DecodeImage(const std::filesystem::path& file) {
    auto input = Open(file);
    const OIIO::ImageSpec layout = input->spec();
    int channels = layout.nchannels;
    if (channels < 1) Fail(file, "the image has no channels");
    size_t count = static_cast<size_t>(layout.width) * static_cast<size_t>(layout.height);
    std::vector<float> stored(count * static_cast<size_t>(channels));
    if (!input->read_image(0, 0, 0, channels, OIIO::TypeDesc::FLOAT, stored.data())) {
        Fail(file, input->geterror());
    }

    // Grey, grey and alpha, colour, or colour and alpha; further channels are ignored.
    int alphaChannel = layout.alpha_channel >= 0 ? layout.alpha_channel : (channels == 2 ? 1 : -1);
    if (channels >= 4 && alphaChannel < 0) alphaChannel = 3;
    int colorChannels = channels >= 3 ? 3 : 1;
    bool associated =
        alphaChannel >= 0 && layout.get_int_attribute("oiio:UnassociatedAlpha", 0) == 0;

    DecodedImage image;
    image.width = layout.width;
    image.height = layout.height;
    image.eightBit = layout.format == OIIO::TypeDesc::UINT8;
    image.pixels.resize(count * 4);
    for (size_t i = 0; i < count; ++i) {
        const float* in = &stored[i * static_cast<size_t>(channels)];
        float* out = &image.pixels[i * 4];
        float alpha = alphaChannel >= 0 ? in[alphaChannel] : 1.0f;
        // Files that store premultiplied colour (EXR, for one) are made straight here.
        float unpremultiply = associated && alpha > 0.0f ? 1.0f / alpha : 1.0f;
        out[0] = alpha;
        for (int c = 0; c < 3; ++c)
            out[1 + c] = in[colorChannels == 3 ? c : 0] * unpremultiply;
    }
    return image;
}

bool DecodesWhole(const std::filesystem::path& file) {
    try {
        DecodeImage(file);
        return true;
    } catch (const CompositionError&) {
        return false;
    }
}

}  // namespace ostrel
