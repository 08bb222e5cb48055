// Flattened instance options from arbitrary bytes, as a project file may hold them: the
// plug-in sets up an options record from them, flattens it again and lets it go, through the
// host's memory suite, and every handle it took is given back.
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>

#include "instance_options.h"
#include "suites/memory_suite.h"
#include "suites/suite_registry.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const QNGP_MemorySuite1* memory = ostrel::MemorySuite();
    const QNGP_InData in{ostrel::SuiteRegistry::BasicSuite(), 1};
    QNGP_MemHandle flattened = nullptr, options = nullptr, again = nullptr;
    if (memory->NewHandle(1, "fuzzed options", size, 0, &flattened) != 0) return 0;
    void* bytes = nullptr;
    memory->LockHandle(flattened, &bytes);
    if (size) std::memcpy(bytes, data, size);
    memory->UnlockHandle(flattened);
    if (ORM_InstanceSetUp(&in, nullptr, nullptr, nullptr, nullptr, flattened, &options) == 0) {
        ORM_FlattenInstance(&in, nullptr, nullptr, nullptr, options, &again);
        ORM_InstanceSetDown(&in, nullptr, nullptr, nullptr, options);
    }
    memory->FreeHandle(flattened);
    if (again) memory->FreeHandle(again);
    if (ostrel::LiveMemoryHandles() != 0) std::abort();
    return 0;
}
