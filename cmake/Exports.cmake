# The shared library exports exactly the ZAL_API declarations of the public headers.
# cmake/libzal-ipod-2.map lists them by name and is the record a change of the API shows up
# in; the build links with a copy regenerated from the headers, so that a new declaration
# links at once, and the ABI test fails (naming scripts/update-exports) until the recorded
# list is brought up to date.
file(GLOB ZAL_PUBLIC_HEADERS CONFIGURE_DEPENDS ${PROJECT_SOURCE_DIR}/include/zal-ipod-2/*.h)
set(ZAL_EXPORT_MAP ${PROJECT_BINARY_DIR}/libzal-ipod-2.map)
add_custom_command(OUTPUT ${ZAL_EXPORT_MAP}
    COMMAND ${CMAKE_COMMAND} -E env "CC=${CMAKE_C_COMPILER}"
        ${PROJECT_SOURCE_DIR}/scripts/update-exports --output ${ZAL_EXPORT_MAP}
    DEPENDS ${ZAL_PUBLIC_HEADERS} ${PROJECT_SOURCE_DIR}/scripts/update-exports
    COMMENT "Listing the exports of the public headers"
    VERBATIM)
add_custom_target(zal-ipod-2-exports DEPENDS ${ZAL_EXPORT_MAP})
