# The ABI test inspects the built shared library: where it is and how to list its symbols,
# and compares with the recorded export list and with what the public headers declare.
find_program(ZAL_NM_PROGRAM NAMES nm REQUIRED)
target_compile_definitions(abi_test PRIVATE
    ZAL_SHARED_LIBRARY_PATH="$<TARGET_FILE:zal-ipod-2>"
    ZAL_NM_PROGRAM="${ZAL_NM_PROGRAM}"
    ZAL_EXPORT_MAP_PATH="${PROJECT_SOURCE_DIR}/cmake/libzal-ipod-2.map"
    ZAL_UPDATE_EXPORTS="${PROJECT_SOURCE_DIR}/scripts/update-exports"
    ZAL_C_COMPILER="${CMAKE_C_COMPILER}"
    ZAL_PUBLIC_INCLUDE_DIR="${PROJECT_SOURCE_DIR}/include")
target_link_libraries(abi_test PRIVATE ${CMAKE_DL_LIBS})
add_dependencies(abi_test zal-ipod-2)
