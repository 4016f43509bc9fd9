# Plug-in libraries that the loader tests load by path. They are built with hidden
# visibility, so each one also checks that ZAL_PLUGIN_EXPORT exports what it marks.
set(ZAL_TEST_PLUGINS usb_to_host_only usb_init_fails no_entry_points all_entry_points)
foreach(plugin ${ZAL_TEST_PLUGINS})
    add_library(zal-test-plugin-${plugin} MODULE ${CMAKE_CURRENT_SOURCE_DIR}/plugins/${plugin}.c)
    target_include_directories(zal-test-plugin-${plugin} PRIVATE ${PROJECT_SOURCE_DIR}/include)
    set_target_properties(zal-test-plugin-${plugin} PROPERTIES C_VISIBILITY_PRESET hidden)
    zal_target_warnings(zal-test-plugin-${plugin})
    string(TOUPPER ${plugin} plugin_upper)
    foreach(consumer plugins_test command_line_test)
        target_compile_definitions(${consumer} PRIVATE
            ZAL_TEST_PLUGIN_${plugin_upper}="$<TARGET_FILE:zal-test-plugin-${plugin}>")
        add_dependencies(${consumer} zal-test-plugin-${plugin})
    endforeach()
endforeach()
target_link_libraries(plugins_test PRIVATE ${CMAKE_DL_LIBS})
target_link_libraries(command_line_test PRIVATE ${CMAKE_DL_LIBS})
