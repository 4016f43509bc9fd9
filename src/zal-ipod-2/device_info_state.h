// Device information kept in the client handle: the last lingo version answered and the
// localization texts. Filled by their decoders (in a _sync call or through the pending-reply
// slots), read by the result accessors. Zero when the handle is made; never reset.
#pragma once

#include <cstddef>
#include <cstdint>

// "%d.%d" of the lingo version: at most 7 characters and the NUL.
constexpr std::size_t kLingoVersionTextSize = 8;
// Localization types 0 and 1, each at most 63 characters and the NUL.
constexpr int kLocalizationTypes = 2;
constexpr std::size_t kLocalizationTextSize = 64;

struct zal_device_info_state {
    int32_t lingo_major = 0;
    int32_t lingo_minor = 0;
    char lingo_version[kLingoVersionTextSize] = {};
    char localization[kLocalizationTypes][kLocalizationTextSize] = {};
};
