// System properties: libcutils on Android, an in-process store on a Linux host.
#include "common/platform/properties.h"

#include <cstring>

#ifdef __ANDROID__
#include <cutils/properties.h>

int platform_property_get(const char *key, char *value, const char *default_value) {
    return property_get(key, value, default_value);
}
int platform_property_set(const char *key, const char *value) {
    return property_set(key, value);
}
void platform_property_clear() {}

#else
#include <map>
#include <mutex>
#include <string>

namespace {
std::mutex store_lock;
std::map<std::string, std::string> &store() {
    static std::map<std::string, std::string> values;
    return values;
}

int copy_out(char *value, const char *text) {
    std::size_t n = std::strlen(text);
    if (n >= kPlatformPropertyValueMax) n = kPlatformPropertyValueMax - 1;
    std::memcpy(value, text, n);
    value[n] = '\0';
    return static_cast<int>(n);
}
}  // namespace

int platform_property_get(const char *key, char *value, const char *default_value) {
    if (value == nullptr) return 0;
    try {
        std::lock_guard<std::mutex> hold(store_lock);
        if (key != nullptr) {
            auto it = store().find(key);
            if (it != store().end()) return copy_out(value, it->second.c_str());
        }
    } catch (...) {
        // fall through to the default
    }
    return copy_out(value, default_value ? default_value : "");
}

int platform_property_set(const char *key, const char *value) {
    if (key == nullptr || value == nullptr) return -1;
    if (std::strlen(value) >= kPlatformPropertyValueMax) return -1;
    try {
        std::lock_guard<std::mutex> hold(store_lock);
        store()[key] = value;
        return 0;
    } catch (...) {
        return -1;
    }
}

void platform_property_clear() {
    std::lock_guard<std::mutex> hold(store_lock);
    store().clear();
}
#endif
