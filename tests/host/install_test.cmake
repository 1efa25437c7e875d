# SPDX-License-Identifier: LGPL-2.1-or-later
# Installs a program to a prefix that is chosen only then, and checks that the file that starts it
# names it there, and gives a service of the system little to do harm with.
#   cmake -Dscript=CMAKE_INSTALL_SCRIPT -Dcomponent=NAME -Dprefix=FOLDER -P THIS
file(REMOVE_RECURSE ${prefix})
execute_process(
    COMMAND ${CMAKE_COMMAND} -DCMAKE_INSTALL_COMPONENT=${component} -DCMAKE_INSTALL_PREFIX=${prefix}
        -P ${script}
    OUTPUT_QUIET COMMAND_ERROR_IS_FATAL ANY)
file(GLOB_RECURSE services ${prefix}/*.service)
file(STRINGS ${services} line REGEX "^Exec(Start)?=")
string(REGEX REPLACE "^Exec(Start)?=([^ ]*).*" "\\2" program "${line}")
string(FIND "${program}" "${prefix}/" place)
if(NOT place EQUAL 0 OR NOT EXISTS "${program}")
    message(FATAL_ERROR "${services} starts \"${program}\"")
endif()

if(NOT services MATCHES "/systemd/")
    return()
endif()
find_program(analyze systemd-analyze)
if(NOT analyze)
    message("systemd-analyze is missing: what the service may do is not rated")
    return()
endif()
# The threshold is in tenths.
execute_process(COMMAND ${analyze} security --offline=true --threshold=20 --no-pager ${services}
    OUTPUT_VARIABLE rating RESULT_VARIABLE status)
if(NOT status EQUAL 0)
    message(FATAL_ERROR "${services} may do too much:\n${rating}")
endif()
