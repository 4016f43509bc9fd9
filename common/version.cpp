// Release numbers and the process-wide id counter.
#include "zal-ipod-2/common.h"

namespace {
constexpr int kLevel0 = 2;
constexpr int kLevel1 = 0;
constexpr int kLevel2 = 10;
int next_id = 1;
}  // namespace

extern "C" {

ZAL_API int getVersionLevel0(void) {
    return kLevel0;
}
ZAL_API int getVersionLevel1(void) {
    return kLevel1;
}
ZAL_API int getVersionLevel2(void) {
    return kLevel2;
}

ZAL_API void getReleaseVersion(int *level0, int *level1, int *level2) {
    if (level0) *level0 = kLevel0;
    if (level1) *level1 = kLevel1;
    if (level2) *level2 = kLevel2;
}

ZAL_API int get_next_id(void) {
    return next_id++;
}
}
