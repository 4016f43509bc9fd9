// VoiceOver item record of the client handle: the last item the device reported under the
// VoiceOver cursor, per item property type. Filled by the item decoder, read by the
// zal_ipod_voiceover_item_ accessors without traffic. Zero when the handle is made;
// nothing resets it (a session change keeps the last answer).
#pragma once

#include <cstddef>
#include <cstdint>

// Property types 0, 1 and 2 carry an index pair and a name; type 3 is the item's frame.
constexpr int kVoiceOverNamedTypes = 3;
constexpr int kVoiceOverFrameType = 3;
// Bytes of one name buffer: at most 127 characters and the NUL.
constexpr std::size_t kVoiceOverNameSize = 128;

struct zal_voiceover_state {
    uint16_t current_index[kVoiceOverNamedTypes] = {};
    uint16_t last_index[kVoiceOverNamedTypes] = {};
    char name[kVoiceOverNamedTypes][kVoiceOverNameSize] = {};
    uint16_t topleft_x = 0;
    uint16_t topleft_y = 0;
    uint16_t bottomright_x = 0;
    uint16_t bottomright_y = 0;
};
