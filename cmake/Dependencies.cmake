# Locates the platform libraries the library is built on: Android's liblog and libcutils.
# On a Linux host they come from Debian's android-liblog-dev and android-libcutils-dev
# (headers under include/android, libraries in the android/ subfolder of the multiarch
# library folder); on Android from the NDK/platform sysroot.

set(_zal_android_hint "Install them with: sudo apt-get install android-liblog-dev android-libcutils-dev")

find_path(ANDROID_LOG_INCLUDE_DIR android/log.h
    PATH_SUFFIXES android
    DOC "Folder holding android/log.h")
find_library(ANDROID_LOG_LIBRARY NAMES log
    PATH_SUFFIXES android
    DOC "Android's liblog")
find_path(ANDROID_CUTILS_INCLUDE_DIR cutils/sockets.h
    PATH_SUFFIXES android
    DOC "Folder holding cutils/sockets.h")
find_library(ANDROID_CUTILS_LIBRARY NAMES cutils
    PATH_SUFFIXES android
    DOC "Android's libcutils")

foreach(_v ANDROID_LOG_INCLUDE_DIR ANDROID_LOG_LIBRARY ANDROID_CUTILS_INCLUDE_DIR ANDROID_CUTILS_LIBRARY)
    if(NOT ${_v})
        message(FATAL_ERROR
            "zal-ipod-2 needs Android's liblog and libcutils (${_v} not found). ${_zal_android_hint}")
    endif()
endforeach()

if(NOT TARGET zal::android_log)
    add_library(zal::android_log UNKNOWN IMPORTED)
    set_target_properties(zal::android_log PROPERTIES
        IMPORTED_LOCATION "${ANDROID_LOG_LIBRARY}"
        INTERFACE_INCLUDE_DIRECTORIES "${ANDROID_LOG_INCLUDE_DIR}")
    add_library(zal::android_cutils UNKNOWN IMPORTED)
    set_target_properties(zal::android_cutils PROPERTIES
        IMPORTED_LOCATION "${ANDROID_CUTILS_LIBRARY}"
        INTERFACE_INCLUDE_DIRECTORIES "${ANDROID_CUTILS_INCLUDE_DIR}")
endif()
