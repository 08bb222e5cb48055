// The scene model as readable text, for error messages and test failures. One line per record;
// a scene adds its layers and lights on lines of their own.
#pragma once

#include <ostream>
#include <sstream>
#include <string>

#include "renderer/scene/scene_desc.h"

std::ostream& operator<<(std::ostream& out, SY_SamplingFilter filter);
std::ostream& operator<<(std::ostream& out, const SY_Material& material);
std::ostream& operator<<(std::ostream& out, const SY_LayerDesc& layer);
std::ostream& operator<<(std::ostream& out, const SY_LightDesc& light);
std::ostream& operator<<(std::ostream& out, const SY_CameraDOFDesc& dof);
std::ostream& operator<<(std::ostream& out, const SY_SceneDesc& scene);

template <class T>
std::string SY_ToString(const T& value) {
    std::ostringstream out;
    out << value;
    return out.str();
}
