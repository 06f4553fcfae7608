include(${CMAKE_CURRENT_LIST_DIR}/WebapiDescription.cmake)

#[[
    webapi_add_package(<API name> SOURCES <file>... [LIBRARIES <library>...] [DESCRIPTION <file>])

Builds the API library <API name>.so as the target <API name> and installs it together with its description file:

    <prefix>/lib/zova/webapi/<API name>.so
    <prefix>/zova/zovaman/webapi/<API name>.lib

On a device the prefix is /usr. The description file, <API name>.lib of the current folder unless DESCRIPTION names
another, is checked at configure time; "lib" of each API in it must be /usr/lib/zova/webapi/<API name>.so.

The library is linked with webapi::webapi and LIBRARIES. Its symbols are hidden but for those marked
WEBAPI_LIBRARY_EXPORT.
]]
function(webapi_add_package name)
    cmake_parse_arguments(PARSE_ARGV 1 arg "" "DESCRIPTION" "SOURCES;LIBRARIES")
    if(arg_UNPARSED_ARGUMENTS OR arg_KEYWORDS_MISSING_VALUES)
        message(FATAL_ERROR "webapi_add_package(${name}): cannot use \"${arg_UNPARSED_ARGUMENTS}"
                            "${arg_KEYWORDS_MISSING_VALUES}\"")
    endif()
    if(NOT arg_SOURCES)
        message(FATAL_ERROR "webapi_add_package(${name}): SOURCES names no file")
    endif()
    if(NOT arg_DESCRIPTION)
        set(arg_DESCRIPTION ${name}.lib)
    endif()
    get_filename_component(description "${arg_DESCRIPTION}" ABSOLUTE)
    webapi_check_description("${description}" "${name}" "/usr/lib/zova/webapi/${name}.so")
    set_property(DIRECTORY APPEND PROPERTY CMAKE_CONFIGURE_DEPENDS "${description}")

    add_library(${name} MODULE ${arg_SOURCES})
    target_link_libraries(${name} PRIVATE webapi::webapi ${arg_LIBRARIES})
    target_compile_features(${name} PRIVATE cxx_std_17)
    set_target_properties(${name} PROPERTIES
        PREFIX ""
        SUFFIX .so
        OUTPUT_NAME ${name}
        CXX_VISIBILITY_PRESET hidden
        VISIBILITY_INLINES_HIDDEN ON
        POSITION_INDEPENDENT_CODE ON
        LIBRARY_OUTPUT_DIRECTORY ${PROJECT_BINARY_DIR}/webapi)

    install(TARGETS ${name} LIBRARY DESTINATION lib/zova/webapi)
    install(FILES "${description}" DESTINATION zova/zovaman/webapi RENAME ${name}.lib)
endfunction()
