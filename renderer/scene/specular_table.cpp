#include "renderer/scene/specular_table.h"

#include <cmath>

const SY_SpecularTable& SY_SpecularTables::ForShininess(double shininess) {
    auto exponent = static_cast<float>(shininess * 0.5);
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
