# Installation: the shared library (with its SONAME link and the development link), its
# static twin, the public headers, a pkg-config file, a CMake package and the programs.
#
#   cmake --install build/<preset> --prefix <dir>
#
# Consumers then use either
#   pkg-config --cflags --libs zal-ipod-2            (add --static for the static library)
# or
#   find_package(zal-ipod-2 2 REQUIRED)
#   target_link_libraries(app PRIVATE zal-ipod-2::zal-ipod-2)    # or zal-ipod-2::static
include(CMakePackageConfigHelpers)

set(ZAL_INSTALL_CMAKEDIR "${CMAKE_INSTALL_LIBDIR}/cmake/zal-ipod-2"
    CACHE STRING "Where the CMake package files go, relative to the prefix")

# Debian keeps liblog and libcutils outside the linker's search path (in the android/
# subfolder of the multiarch library folder) and reaches them through RUNPATH; do the same
# so that an installed library finds them. Folders the loader searches anyway are left out.
set(_zal_android_dirs "")
foreach(_lib ${ANDROID_LOG_LIBRARY} ${ANDROID_CUTILS_LIBRARY})
    get_filename_component(_dir "${_lib}" DIRECTORY)
    if(NOT _dir IN_LIST CMAKE_C_IMPLICIT_LINK_DIRECTORIES)
        list(APPEND _zal_android_dirs "${_dir}")
    endif()
endforeach()
list(REMOVE_DUPLICATES _zal_android_dirs)
get_filename_component(_zal_android_log_dir "${ANDROID_LOG_LIBRARY}" DIRECTORY)
get_filename_component(_zal_android_cutils_dir "${ANDROID_CUTILS_LIBRARY}" DIRECTORY)

set_target_properties(zal-ipod-2 PROPERTIES
    EXPORT_NAME zal-ipod-2
    INSTALL_RPATH "${_zal_android_dirs}")
set_target_properties(zal-ipod-2-static PROPERTIES EXPORT_NAME static)

install(TARGETS zal-ipod-2 zal-ipod-2-static
    EXPORT zal-ipod-2-targets
    LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR} NAMELINK_COMPONENT Development
    ARCHIVE DESTINATION ${CMAKE_INSTALL_LIBDIR} COMPONENT Development
    RUNTIME DESTINATION ${CMAKE_INSTALL_BINDIR})

# The public headers. The library's private headers live in src/ and common/, never here.
install(DIRECTORY ${PROJECT_SOURCE_DIR}/include/zal-ipod-2
    DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}
    COMPONENT Development
    FILES_MATCHING PATTERN "*.h")

# The programs, when this build has them. They find the library next to them (../lib).
file(RELATIVE_PATH _zal_bin_to_lib
    "${CMAKE_INSTALL_FULL_BINDIR}" "${CMAKE_INSTALL_FULL_LIBDIR}")
function(zal_install_program program)
    set_target_properties(${program} PROPERTIES
        INSTALL_RPATH "$ORIGIN/${_zal_bin_to_lib};${_zal_android_dirs}")
    install(TARGETS ${program} RUNTIME DESTINATION ${CMAKE_INSTALL_BINDIR})
endfunction()
if(TARGET zald-sim)
    zal_install_program(zald-sim)
endif()
if(TARGET zalctl)
    zal_install_program(zalctl)
endif()

# CMake package: zal-ipod-2::zal-ipod-2 (shared) and zal-ipod-2::static.
install(EXPORT zal-ipod-2-targets
    NAMESPACE zal-ipod-2::
    DESTINATION ${ZAL_INSTALL_CMAKEDIR}
    COMPONENT Development)
configure_package_config_file(
    ${PROJECT_SOURCE_DIR}/cmake/zal-ipod-2-config.cmake.in
    ${PROJECT_BINARY_DIR}/zal-ipod-2-config.cmake
    INSTALL_DESTINATION ${ZAL_INSTALL_CMAKEDIR})
write_basic_package_version_file(
    ${PROJECT_BINARY_DIR}/zal-ipod-2-config-version.cmake
    VERSION ${PROJECT_VERSION}
    COMPATIBILITY SameMajorVersion)
install(FILES
        ${PROJECT_BINARY_DIR}/zal-ipod-2-config.cmake
        ${PROJECT_BINARY_DIR}/zal-ipod-2-config-version.cmake
    DESTINATION ${ZAL_INSTALL_CMAKEDIR}
    COMPONENT Development)

# pkg-config. The static library needs liblog, libcutils, threads and libdl after it;
# neither Android library ships a .pc file on Debian, hence Libs.private, not Requires.
set(ZAL_PC_LIBS_PRIVATE "")
# Outside the loader's path too: the program needs a RUNPATH to them, as the shared
# library has one.
foreach(_dir ${_zal_android_dirs})
    string(APPEND ZAL_PC_LIBS_PRIVATE " -L${_dir} -Wl,-rpath,${_dir}")
endforeach()
string(APPEND ZAL_PC_LIBS_PRIVATE " -llog -lcutils -pthread")
foreach(_lib ${CMAKE_DL_LIBS})
    string(APPEND ZAL_PC_LIBS_PRIVATE " -l${_lib}")
endforeach()
# The library is C++ inside: a C program linking the archive needs the C++ runtime.
string(APPEND ZAL_PC_LIBS_PRIVATE " -lstdc++ -lm")
string(STRIP "${ZAL_PC_LIBS_PRIVATE}" ZAL_PC_LIBS_PRIVATE)
# Relocatable: the prefix is found from where the .pc file lies, so that
# `cmake --install --prefix <dir>` gives a working file too.
file(RELATIVE_PATH ZAL_PC_TO_PREFIX "/prefix/${CMAKE_INSTALL_LIBDIR}/pkgconfig" "/prefix")
string(REGEX REPLACE "/$" "" ZAL_PC_TO_PREFIX "${ZAL_PC_TO_PREFIX}")
foreach(_dir LIBDIR INCLUDEDIR)
    if(IS_ABSOLUTE "${CMAKE_INSTALL_${_dir}}")
        set(ZAL_PC_${_dir} "${CMAKE_INSTALL_${_dir}}")
    else()
        set(ZAL_PC_${_dir} "\${prefix}/${CMAKE_INSTALL_${_dir}}")
    endif()
endforeach()
configure_file(${PROJECT_SOURCE_DIR}/cmake/zal-ipod-2.pc.in
    ${PROJECT_BINARY_DIR}/zal-ipod-2.pc @ONLY)
install(FILES ${PROJECT_BINARY_DIR}/zal-ipod-2.pc
    DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig
    COMPONENT Development)
