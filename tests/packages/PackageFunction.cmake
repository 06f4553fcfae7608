# Runs the check of description files over good and bad ones, and webapi_add_package with bad arguments, each in a CMake
# of its own.

file(REMOVE_RECURSE ${WORK})
file(MAKE_DIRECTORY ${WORK})
file(WRITE ${WORK}/check.cmake "include(${MODULES}/WebapiDescription.cmake)
webapi_check_description(\${FILE} \${PACKAGE} /usr/lib/zova/webapi/\${PACKAGE}.so)\n")
set_property(GLOBAL PROPERTY cases 0)
set_property(GLOBAL PROPERTY failures 0)

function(run package text code output)
    file(WRITE ${WORK}/${package}.lib "${text}")
    execute_process(COMMAND ${CMAKE_COMMAND} -D FILE=${WORK}/${package}.lib -D PACKAGE=${package} -P ${WORK}/check.cmake
        RESULT_VARIABLE result OUTPUT_VARIABLE out ERROR_VARIABLE err)
    # A message is broken into lines of a fixed width.
    string(REGEX REPLACE "[ \n]+" " " joined "${out}${err}")
    set(${code} ${result} PARENT_SCOPE)
    set(${output} "${joined}" PARENT_SCOPE)
endfunction()

function(count name value)
    get_property(number GLOBAL PROPERTY ${name})
    math(EXPR number "${number} + ${value}")
    set_property(GLOBAL PROPERTY ${name} ${number})
endfunction()

function(accept name package text)
    count(cases 1)
    run(${package} "${text}" code output)
    if(NOT code EQUAL 0)
        message("${name}: was refused: ${output}")
        count(failures 1)
    endif()
endfunction()

function(refuse name package text expected)
    count(cases 1)
    run(${package} "${text}" code output)
    string(FIND "${output}" "${expected}" position)
    if(code EQUAL 0 OR position EQUAL -1)
        message("${name}: status ${code}, not refused with \"${expected}\": ${output}")
        count(failures 1)
    endif()
endfunction()

# The text of a file that describes A.B with the members `members` beside a good "lib".
function(describe out members)
    set(${out} "{ \"A.B\": { \"lib\": \"/usr/lib/zova/webapi/A.B.so\"${members} } }" PARENT_SCOPE)
endfunction()

set(versions ", \"minVersion\": 1, \"maxVersion\": 1")

describe(text "${versions}, \"methods\": { \"1\": [{ \"set\": {} }, \"get\", \"list\"] }, \"own\": \"http://x/[1]; {\\\"\\\"},]\"")
accept("a good file" A.B "${text}")
string(REPLACE "\"A.B\":" "\"A.B.C\":" deeper "${text}")
accept("an API below the package's name" A.B "${deeper}")
describe(text ", \"minVersion\": 2, \"maxVersion\": 3, \"priority\": -10, \"methods\": { \"2\": [\"get\"], \"3\": [\"get\"] }")
accept("two versions" A.B "${text}")
describe(text "${versions}, \"priority\": 10, \"methods\": { \"1\": [\"get\"] }")
accept("the highest priority" A.B "${text}")

refuse("an empty file" A.B "" "no JSON object")
refuse("no JSON" A.B "{ \"A.B\": " "no JSON object")
refuse("an array" A.B "[]" "no JSON object")
refuse("no API" A.B "{}" "describes no API")
refuse("a comment" A.B "{ // x\n}" "comments and trailing commas")
refuse("a trailing comma" A.B "{ \"A.B\": {}, }" "comments and trailing commas")
refuse("an API that is no object" A.B "{ \"A.B\": 1 }" "must be an object")
refuse("an API elsewhere" A.B "{ \"A.C\": {} }" "does not look into A.B.lib")
refuse("an API that only begins alike" A.B "{ \"A.Bee\": {} }" "does not look into A.B.lib")
refuse("an API below a name of one part" A "{ \"A.B\": {} }" "does not look into A.lib")
refuse("an API name with a slash" A.B "{ \"A.B./x\": {} }" "is no API name")
refuse("an API name with an empty part" A.B "{ \"A.B..x\": {} }" "is no API name")
refuse("a package name of six parts" A.B.C.D.E.F "{ \"A.B.C.D.E.F\": {} }" "more than five name parts")
refuse("no lib" A.B "{ \"A.B\": {} }" "\"lib\" must be")
refuse("another lib" A.B "{ \"A.B\": { \"lib\": \"/tmp/x.so\" } }" "\"lib\" must be")
refuse("a lib that is no text" A.B "{ \"A.B\": { \"lib\": 1 } }" "\"lib\" must be")

foreach(row
    "no minVersion|, \"maxVersion\": 1|\"minVersion\" is missing"
    "no maxVersion|, \"minVersion\": 1|\"maxVersion\" is missing"
    "a version that is a text|, \"minVersion\": \"1\", \"maxVersion\": 1|\"minVersion\" must be an integer"
    "a version that is a fraction|, \"minVersion\": 1.5, \"maxVersion\": 2|\"minVersion\" must be an integer"
    "a huge version|, \"minVersion\": 1, \"maxVersion\": 99999999999|\"maxVersion\" must be an integer"
    "version 0|, \"minVersion\": 0, \"maxVersion\": 1|at least 1"
    "versions the wrong way round|, \"minVersion\": 2, \"maxVersion\": 1|at least 1"
    "no methods|${versions}|\"methods\" must be an object"
    "methods that are an array|${versions}, \"methods\": [\"get\"]|\"methods\" must be an object"
    "empty methods|${versions}, \"methods\": {}|\"methods\" is empty"
    "a version outside|${versions}, \"methods\": { \"2\": [\"get\"] }|no version from 1 to 1"
    "a version that is a word|${versions}, \"methods\": { \"one\": [\"get\"] }|no version from 1 to 1"
    "a version without methods|, \"minVersion\": 1, \"maxVersion\": 2, \"methods\": { \"1\": [\"get\"] }|needs a list of its own"
    "a list that is an object|${versions}, \"methods\": { \"1\": {} }|must be an array"
    "an empty list|${versions}, \"methods\": { \"1\": [] }|names no method"
    "an entry that is a number|${versions}, \"methods\": { \"1\": [7] }|must be a method's name or an object"
    "an entry of two methods|${versions}, \"methods\": { \"1\": [{ \"a\": {}, \"b\": {} }] }|must have one member"
    "an entry of no method|${versions}, \"methods\": { \"1\": [{}] }|must have one member"
    "attributes that are no object|${versions}, \"methods\": { \"1\": [{ \"a\": true }] }|must be an object"
    "a priority too high|${versions}, \"priority\": 11|must lie between -10 and 10"
    "a priority too low|${versions}, \"priority\": -11|must lie between -10 and 10"
    "a priority that is a fraction|${versions}, \"priority\": 1.5|\"priority\" must be an integer")
    # A row holds no ";" and its lists stay whole only without splitting at brackets.
    string(REGEX MATCH "^([^|]*)\\|([^|]*)\\|([^|]*)$" whole "${row}")
    set(name "${CMAKE_MATCH_1}")
    set(members "${CMAKE_MATCH_2}")
    set(expected "${CMAKE_MATCH_3}")
    describe(text "${members}")
    refuse("${name}" A.B "${text}" "${expected}")
endforeach()

function(refuse_call arguments expected)
    count(cases 1)
    file(WRITE ${WORK}/call.cmake "include(${MODULES}/WebapiPackage.cmake)\nwebapi_add_package(${arguments})\n")
    execute_process(COMMAND ${CMAKE_COMMAND} -P ${WORK}/call.cmake RESULT_VARIABLE code ERROR_VARIABLE output)
    string(REGEX REPLACE "[ \n]+" " " output "${output}")
    string(FIND "${output}" "${expected}" position)
    if(code EQUAL 0 OR position EQUAL -1)
        message("webapi_add_package(${arguments}): status ${code}, not refused with \"${expected}\": ${output}")
        count(failures 1)
    endif()
endfunction()

refuse_call("A.B" "SOURCES names no file")
refuse_call("A.B SOURCES" "cannot use \"SOURCES\"")
refuse_call("A.B a.cpp SOURCES b.cpp" "cannot use \"a.cpp\"")
refuse_call("A.B SOURCES a.cpp DESCRIPTION" "cannot use \"DESCRIPTION\"")
refuse_call("A.B SOURCES a.cpp DESCRIPTION no-such-file.lib" "there is no such description file")

get_property(cases GLOBAL PROPERTY cases)
get_property(failures GLOBAL PROPERTY failures)
message("${cases} cases, ${failures} failures")
if(failures GREATER 0 OR cases LESS 47)
    message(FATAL_ERROR "the checks do not hold")
endif()
