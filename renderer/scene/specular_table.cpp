#include "renderer/scene/specular_table.h"

#include <cmath>

double SY_SpecularExponent(double shininess) {
    constexpr double kDoublings = 9;  // 2⁹ = 512 at full shininess
    return std::exp2(kDoublings * shininess / 100.0);
}

const SY_SpecularTable& SY_SpecularTables::ForShininess(double shininess) {
    auto exponent = static_cast<float>(SY_SpecularExponent(shininess) * 0.5);
    for (const auto& table : tables_) {
        if (table->exponent == exponent) return *table;
    }
    auto table = std::make_unique<SY_SpecularTable>();
    for (int32_t i = 0; i <= SY_SpecularTable::kSteps; ++i) {
        table->values[i] =
            std::pow(static_cast<float>(i) * (1.0f / SY_SpecularTable::kSteps), exponent);
    }
    for (int32_t i = SY_SpecularTable::kSteps + 1; i < SY_SpecularTable::kEntries; ++i) {
        table->values[i] = 1.0f;
    }
    table->exponent = exponent;
    tables_.push_back(std::move(table));
    return *tables_.back();
}
