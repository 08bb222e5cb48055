#include "plugins/property_list.h"

#include <algorithm>
#include <cstring>

#include "host_error.h"

namespace ostrel {
namespace {

constexpr char kVendor[] = "4KVR";

// Reads little-endian values and reversed four-character codes, failing past the end.
class Reader {
public:
    Reader(std::span<const uint8_t> bytes, const std::string& source)
        : bytes_(bytes), source_(source) {}

    uint32_t U32(const char* what) {
        Need(4, what);
        uint32_t value = 0;
        for (int i = 3; i >= 0; --i)
            value = value << 8 | bytes_[offset_ + static_cast<size_t>(i)];
        offset_ += 4;
        return value;
    }
    uint16_t U16(const char* what) {
        Need(2, what);
        auto value = static_cast<uint16_t>(bytes_[offset_] | bytes_[offset_ + 1] << 8);
        offset_ += 2;
        return value;
    }
    std::string Code(const char* what) {
        Need(4, what);
        std::string code(bytes_.begin() + static_cast<ptrdiff_t>(offset_),
                         bytes_.begin() + static_cast<ptrdiff_t>(offset_ + 4));
        std::reverse(code.begin(), code.end());
        offset_ += 4;
        return code;
    }
    std::span<const uint8_t> Bytes(size_t count, const char* what) {
        Need(count, what);
        auto span = bytes_.subspan(offset_, count);
        offset_ += count;
        return span;
    }
    [[noreturn]] void Fail(const std::string& problem) const {
        throw HostError(source_ + ": not a valid plug-in property list: " + problem);
    }

private:
    void Need(size_t count, const char* what) const {
        if (bytes_.size() - offset_ < count) Fail(std::string("it ends inside ") + what);
    }

    std::span<const uint8_t> bytes_;
    const std::string& source_;
    size_t offset_ = 0;
};

std::string PascalString(std::span<const uint8_t> value, Reader& reader, const char* what) {
    if (value.empty() || value[0] + 1u > value.size()) {
        reader.Fail(std::string("the ") + what + " is not a Pascal string");
    }
    return std::string(value.begin() + 1, value.begin() + 1 + value[0]);
}

uint32_t Number(std::span<const uint8_t> value, Reader& reader, const char* what) {
    if (value.size() < 4) reader.Fail(std::string("the ") + what + " is shorter than four bytes");
    return value[0] | value[1] << 8 | value[2] << 16 | static_cast<uint32_t>(value[3]) << 24;
}

}  // namespace

PropertyList ParsePropertyList(std::span<const uint8_t> bytes, const std::string& source) {
    Reader reader(bytes, source);
    if (reader.U16("the header") != 1) reader.Fail("the first word is not 1");
    reader.U32("the header");
    uint32_t count = reader.U32("the header");
    PropertyList list;
    bool haveKind = false, haveEntry = false;
    for (uint32_t i = 0; i < count; ++i) {
        if (reader.Code("a property") != kVendor) reader.Fail("a property has an unknown vendor");
        std::string key = reader.Code("a property");
        reader.U32("a property");
        uint32_t length = reader.U32("a property");
        auto value = reader.Bytes(length, "a property value");
        reader.Bytes((4 - length % 4) % 4, "a property's padding");
        if (key == "kind") {
            if (value.size() < 4) reader.Fail("the kind is shorter than four bytes");
            list.kind.assign(value.rbegin() + static_cast<ptrdiff_t>(value.size() - 4),
                             value.rend());
            haveKind = true;
        } else if (key == "name") {
            list.name = PascalString(value, reader, "name");
        } else if (key == "catg") {
            list.category = PascalString(value, reader, "category");
        } else if (key == "vers") {
            list.version = Number(value, reader, "version");
        } else if (key == "8664") {
            auto end = std::find(value.begin(), value.end(), uint8_t{0});
            list.entryPoint.assign(value.begin(), end);
            haveEntry = !list.entryPoint.empty();
        } else if (key == "qnFL") {
            list.flags = Number(value, reader, "flags");
        }
    }
    if (!haveKind) reader.Fail("it has no kind");
    if (!haveEntry) reader.Fail("it names no x86-64 entry point");
    return list;
}

}  // namespace ostrel
