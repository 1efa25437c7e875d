# SPDX-License-Identifier: LGPL-2.1-or-later
# Installs packaging/FILE.in with @program@ as the path of an installed program. Made when
# installing, for the prefix may be chosen then.
function(kesbluetooth_install_configured file program destination component)
    install(CODE "
        set(program \"${CMAKE_INSTALL_BINDIR}/${program}\")
        if(NOT IS_ABSOLUTE \"\${program}\")
            string(PREPEND program \"\${CMAKE_INSTALL_PREFIX}/\")
        endif()
        configure_file(\"${PROJECT_SOURCE_DIR}/packaging/${file}.in\"
            \"${CMAKE_CURRENT_BINARY_DIR}/${file}\" @ONLY)" COMPONENT ${component})
    install(FILES ${CMAKE_CURRENT_BINARY_DIR}/${file} DESTINATION ${destination} COMPONENT ${component})
endfunction()
