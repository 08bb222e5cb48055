// Builds property lists byte by byte, as a plug-in's resource holds them.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace ostrel_test {

class PropertyListBuilder {
public:
    PropertyListBuilder& Code(const std::string& key, const std::string& code) {
        return Property(key, {code.rbegin(), code.rend()});
    }
    PropertyListBuilder& Pascal(const std::string& key, const std::string& text) {
        std::vector<uint8_t> value{static_cast<uint8_t>(text.size())};
        value.insert(value.end(), text.begin(), text.end());
        return Property(key, value);
    }
    PropertyListBuilder& Number(const std::string& key, uint32_t number) {
        return Property(key, {uint8_t(number), uint8_t(number >> 8), uint8_t(number >> 16),
                              uint8_t(number >> 24)});
    }
    PropertyListBuilder& Entry(const std::string& name) {
        std::vector<uint8_t> value(name.begin(), name.end());
        value.resize((name.size() + 1 + 15) / 16 * 16, 0);
        return Property("8664", value);
    }
    // A general plug-in with the given entry point, like the renderer's own list.
    static PropertyListBuilder General(const std::string& entry) {
        PropertyListBuilder builder;
        builder.Code("kind", "QNgx")
            .Pascal("name", "$$$/QN/QNGP/Name/Test=Test")
            .Pascal("catg", "Ignored")
            .Number("vers", 0x00010000)
            .Entry(entry)
            .Number("qnFL", 0x10);
        return builder;
    }

    std::vector<uint8_t> Bytes() const {
        std::vector<uint8_t> bytes{1, 0, 0, 0, 0, 0};
        Append32(&bytes, count_);
        bytes.insert(bytes.end(), body_.begin(), body_.end());
        return bytes;
    }

private:
    PropertyListBuilder& Property(const std::string& key, const std::vector<uint8_t>& value) {
        for (const char* code : {"RVK4"})
            body_.insert(body_.end(), code, code + 4);
        body_.insert(body_.end(), key.rbegin(), key.rend());
        Append32(&body_, 0);
        Append32(&body_, static_cast<uint32_t>(value.size()));
        body_.insert(body_.end(), value.begin(), value.end());
        body_.resize((body_.size() + 3) / 4 * 4, 0);
        ++count_;
        return *this;
    }
    static void Append32(std::vector<uint8_t>* bytes, uint32_t v) {
        for (int i = 0; i < 4; ++i)
            bytes->push_back(static_cast<uint8_t>(v >> (8 * i)));
    }

    std::vector<uint8_t> body_;
    uint32_t count_ = 0;
};

}  // namespace ostrel_test
