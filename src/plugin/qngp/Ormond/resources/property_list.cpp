#include "resources/property_list.h"

#include <algorithm>
#include <string_view>
#include <utility>

namespace {

constexpr char kVendor[] = "4KVR";
constexpr char kEntryPointName[] = "GPMain_Ormond";

class PropertyWriter {
public:
    void Word(uint16_t value) {
        for (int shift = 0; shift < 16; shift += 8)
            bytes_.push_back(static_cast<uint8_t>(value >> shift));
    }
    void Long(uint32_t value) {
        for (int shift = 0; shift < 32; shift += 8)
            bytes_.push_back(static_cast<uint8_t>(value >> shift));
    }
    // A four-character code, stored last character first.
    void Code(std::string_view code) { bytes_.insert(bytes_.end(), code.rbegin(), code.rend()); }

    // One property; its length counts the value with its padding.
    void Property(std::string_view key, const std::vector<uint8_t>& value) {
        size_t padded = (value.size() + 3) / 4 * 4;
        Code(kVendor);
        Code(key);
        Long(0);
        Long(static_cast<uint32_t>(padded));
        bytes_.insert(bytes_.end(), value.begin(), value.end());
        bytes_.resize(bytes_.size() + padded - value.size(), 0);
    }

    std::vector<uint8_t> Take() { return std::move(bytes_); }

private:
    std::vector<uint8_t> bytes_;
};

std::vector<uint8_t> CodeValue(std::string_view code) {
    return {code.rbegin(), code.rend()};
}

std::vector<uint8_t> LongValue(uint32_t value) {
    PropertyWriter writer;
    writer.Long(value);
    return writer.Take();
}

std::vector<uint8_t> PascalString(std::string_view text) {
    std::vector<uint8_t> value(text.size() + 1);
    value[0] = static_cast<uint8_t>(text.size());
    std::copy(text.begin(), text.end(), value.begin() + 1);
    return value;
}

// Zero-terminated and padded to 16 bytes.
std::vector<uint8_t> EntryPointName(std::string_view name) {
    std::vector<uint8_t> value(name.begin(), name.end());
    value.resize((name.size() + 1 + 15) / 16 * 16, 0);
    return value;
}

}  // namespace

std::vector<uint8_t> ORM_PropertyListBytes() {
    PropertyWriter writer;
    writer.Word(1);
    writer.Long(0);
    writer.Long(6);
    writer.Property("kind", CodeValue("QNgx"));
    writer.Property("name", PascalString("$$$/QN/QNGP/Name/Tessary3D=Tessary 3D"));
    writer.Property("catg", PascalString("Ignored"));
    writer.Property("vers", LongValue(0x00010000));
    writer.Property("8664", EntryPointName(kEntryPointName));
    writer.Property("qnFL", LongValue(0x10));
    return writer.Take();
}
