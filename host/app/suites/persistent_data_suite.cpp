#include "suites/persistent_data_suite.h"

#include <map>
#include <mutex>
#include <utility>

struct QNGP_PersistentBlob {
    std::mutex mutex;
    std::map<std::pair<std::string, std::string>, int32_t> values;
};

namespace ostrel {
namespace {

QNGP_PersistentBlob& ApplicationBlob() {
    static QNGP_PersistentBlob blob;
    return blob;
}

int32_t GetApplicationBlob(QNGP_PersistentBlobH* blob) {
    if (!blob) return kQNGP_ErrMissingSuite;
    *blob = &ApplicationBlob();
    return 0;
}

int32_t GetLong(QNGP_PersistentBlobH blob, const char* section, const char* key,
                int32_t defaultValue, int32_t* value) {
    if (!blob || !section || !key || !value) return kQNGP_ErrMissingSuite;
    std::lock_guard lock(blob->mutex);
    auto it = blob->values.find({section, key});
    *value = it == blob->values.end() ? defaultValue : it->second;
    return 0;
}

}  // namespace

const QNGP_PersistentDataSuite3* PersistentDataSuite() {
    static const QNGP_PersistentDataSuite3 suite{&GetApplicationBlob, &GetLong};
    return &suite;
}

void SetApplicationSetting(const std::string& section, const std::string& key, int32_t value) {
    std::lock_guard lock(ApplicationBlob().mutex);
    ApplicationBlob().values[{section, key}] = value;
}

void ClearApplicationSettings() {
    std::lock_guard lock(ApplicationBlob().mutex);
    ApplicationBlob().values.clear();
}

}  // namespace ostrel
