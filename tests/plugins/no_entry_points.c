/* A library that loads but defines none of the plug-in entry points. */
#include "zal-ipod-2/plugin.h"

ZAL_PLUGIN_EXPORT int unrelated_function(void);
ZAL_PLUGIN_EXPORT int unrelated_function(void) {
    return 7;
}
