# Installs the framework into a folder of its own, builds a package against it as an outside author would, by CMake and
# by pkg-config, and lets the library answer a call.

set(expected "{\"data\":{\"greeting\":\"Hello, alice\"},\"success\":true}")
set(root ${WORK}/root)
set(flags "")
if(SANITIZE)
    set(flags "-fsanitize=address,undefined")
endif()

function(run)
    execute_process(COMMAND ${ARGN} RESULT_VARIABLE result OUTPUT_VARIABLE out ERROR_VARIABLE err)
    if(NOT result EQUAL 0)
        message(FATAL_ERROR "${ARGN}: ${result}\n${out}${err}")
    endif()
    string(STRIP "${out}" out)
    set(output "${out}" PARENT_SCOPE)
endfunction()

function(check_exists)
    foreach(path ${ARGN})
        if(NOT EXISTS ${path})
            message(FATAL_ERROR "${path} was not installed")
        endif()
    endforeach()
endfunction()

function(check_answer)
    if(NOT output STREQUAL expected)
        message(FATAL_ERROR "answered ${output}, not ${expected}")
    endif()
endfunction()

file(REMOVE_RECURSE ${WORK})
run(${CMAKE_COMMAND} -E env DESTDIR=${root} ${CMAKE_COMMAND} --install ${BUILD} --prefix /usr)
check_exists(${root}/usr/include/webapi/APIRequest.h ${root}/usr/lib/pkgconfig/webapi-ZELM5.pc)
foreach(package ZOVA.Core.Session ZOVA.Core.System ZOVA.Core.Token ZOVA.Core.User)
    check_exists(${root}/usr/lib/zova/webapi/${package}.so ${root}/usr/zova/zovaman/webapi/${package}.lib)
endforeach()

run(${CMAKE_COMMAND} -S ${SOURCE} -B ${WORK}/build -D CMAKE_BUILD_TYPE=Debug -D CMAKE_CXX_COMPILER=${CXX}
    -D CMAKE_PREFIX_PATH=${root}/usr "-DCMAKE_CXX_FLAGS=${flags}")
run(${CMAKE_COMMAND} --build ${WORK}/build)
run(${CMAKE_COMMAND} -E env DESTDIR=${WORK}/device ${CMAKE_COMMAND} --install ${WORK}/build --prefix /usr)
set(installed ${WORK}/device/usr/lib/zova/webapi/Example.Greeting.so)
check_exists(${installed} ${WORK}/device/usr/zova/zovaman/webapi/Example.Greeting.lib
    ${WORK}/device/usr/lib/sharing/permission_lib/example.so)
run(${WORK}/build/call-greeting ${installed})
check_answer()

run(${CMAKE_COMMAND} -E env PKG_CONFIG_PATH=${root}/usr/lib/pkgconfig pkg-config --cflags --libs webapi-ZELM5)
separate_arguments(options UNIX_COMMAND "${flags} ${output}")
run(${CXX} -std=c++17 -shared -fPIC -fvisibility=hidden ${SOURCE}/Greeting.cpp -o ${WORK}/Greeting.so ${options})
run(${WORK}/build/call-greeting ${WORK}/Greeting.so)
check_answer()
message("${output}")
