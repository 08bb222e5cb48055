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
    float exponent;  // the key: half the specular exponent
};

// The specular exponent s of a layer's shininess (percent, 0 to 100): 512^(shininess / 100),
// from cos¹ at 0 % (a broad, soft highlight) to cos⁵¹² at 100 % (a tight spot). A highlight's
// width goes as 1/√s, so equal steps of shininess narrow it by equal ratios.
double SY_SpecularExponent(double shininess);

// The frame's tables, one per distinct exponent, made on demand and kept until the frame ends.
class SY_SpecularTables {
public:
    // The table for a layer's shininess, keyed by s × 0.5: it is indexed by the squared cosine
    // of the half-vector angle, so the halved exponent gives cos^s.
    const SY_SpecularTable& ForShininess(double shininess);

    size_t Count() const { return tables_.size(); }

private:
    std::vector<std::unique_ptr<SY_SpecularTable>> tables_;
};
