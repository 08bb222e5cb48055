// The property list through which the host finds the plug-in before loading its code: kind,
// name, category, version, entry point name and flags.
#pragma once

#include <cstdint>
#include <vector>

// The resource's bytes: a 16-bit word 1, a 32-bit version 0, a 32-bit property count, then per
// property a vendor code, a key, a 32-bit id 0, a 32-bit length and the value padded to four
// bytes. Integers are little-endian; four-character codes are stored with their bytes reversed.
std::vector<uint8_t> ORM_PropertyListBytes();
