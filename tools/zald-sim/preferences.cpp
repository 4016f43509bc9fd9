// Preference classes and their value ranges.
#include "preferences.h"

namespace sim {

namespace {

struct PreferenceClass {
    int32_t number;
    int32_t min, max;
    int32_t initial;
};

// Class 8 takes 1..3, every other class is a switch.
constexpr PreferenceClass kClasses[] = {
    {0, 0, 1, 0}, {1, 0, 1, 0},  {2, 0, 1, 0},  {3, 0, 1, 0},  {8, 1, 3, 1},
    {9, 0, 1, 0}, {10, 0, 1, 0}, {12, 0, 1, 0}, {13, 0, 1, 0},
};

const PreferenceClass *find(int32_t number) {
    for (const auto &c : kClasses)
        if (c.number == number) return &c;
    return nullptr;
}

}  // namespace

bool preference_class_known(int32_t preference_class) {
    return find(preference_class) != nullptr;
}

bool preference_valid(int32_t preference_class, int32_t value) {
    const PreferenceClass *c = find(preference_class);
    return c != nullptr && value >= c->min && value <= c->max;
}

std::map<int32_t, int32_t> default_preferences() {
    std::map<int32_t, int32_t> values;
    for (const auto &c : kClasses) values[c.number] = c.initial;
    return values;
}

}  // namespace sim
