// Specular power tables: pow(cos, e) looked up instead of computed per pixel.
#pragma once

#include <cstdint>
#include <memory>
#include <vector>

#include "u_memory.h"

struct SY_SpecularTable : U_MemTrackedObject {
    static constexpr int32_t kSteps = 2048;    // entry i holds pow(i / 2048, exponent)
    static constexpr int32_t kEntries = 2069;  // the tail absorbs indices just past 1.0

    float values[kEntries];
    float exponent;
};

// The frame's tables, one per distinct exponent, made on demand and kept until the frame ends.
class SY_SpecularTables {
public:
    // The table for a layer's shininess; the exponent is shininess × 0.5.
    const SY_SpecularTable& ForShininess(double shininess);

    size_t Count() const { return tables_.size(); }

private:
    std::vector<std::unique_ptr<SY_SpecularTable>> tables_;
};
