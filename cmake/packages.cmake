# SPDX-License-Identifier: LGPL-2.1-or-later
# Debian packages, one for each component: `cpack` in a build folder that was configured for /usr,
# or scripts/packages.sh. Names and versions follow from the project's version.
set(CPACK_GENERATOR DEB)
set(CPACK_PACKAGE_VENDOR "Kestrine Bluetooth")
set(CPACK_PACKAGE_CONTACT "Kestrine Bluetooth developers <bluetooth@kestrine.com>")
set(CPACK_PACKAGE_DESCRIPTION_SUMMARY "") # each package has its own
set(CPACK_STRIP_FILES ON)
set(CPACK_DEB_COMPONENT_INSTALL ON)
set(CPACK_COMPONENTS_ALL runtime dev doc sim kesbt scannerd autoconnectd)
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
# The changelog says what release of the package this is.
set(debianFiles ${PROJECT_SOURCE_DIR}/packaging/debian)
set_property(DIRECTORY APPEND PROPERTY CMAKE_CONFIGURE_DEPENDS
    ${debianFiles}/changelog ${PROJECT_SOURCE_DIR}/CHANGELOG.md)
file(STRINGS ${debianFiles}/changelog newest LIMIT_COUNT 1)
if(NOT newest MATCHES "^([a-z]+) \\(([0-9.]+)-([0-9]+)\\)" OR NOT CMAKE_MATCH_2 STREQUAL PROJECT_VERSION)
    message(FATAL_ERROR "packaging/debian/changelog does not begin with version ${PROJECT_VERSION}")
endif()
set(CPACK_DEBIAN_PACKAGE_SOURCE ${CMAKE_MATCH_1})
set(CPACK_DEBIAN_PACKAGE_RELEASE ${CMAKE_MATCH_3})
set(CPACK_DEBIAN_PACKAGE_CONTROL_STRICT_PERMISSION ON)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
set(CPACK_DEBIAN_PACKAGE_GENERATE_SHLIBS ON)
set(CPACK_DEBIAN_PACKAGE_GENERATE_SHLIBS_POLICY ">=")
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS_PRIVATE_DIRS ${PROJECT_BINARY_DIR}/src)
set(version ${PROJECT_VERSION}-${CPACK_DEBIAN_PACKAGE_RELEASE})
set(library libkesbluetooth${PROJECT_VERSION_MAJOR})

# kesbluetooth_package(COMPONENT NAME SECTION DEPENDS SUMMARY TEXT)
macro(kesbluetooth_package component name section depends summary text)
    string(TOUPPER ${component} upper)
    set(CPACK_DEBIAN_${upper}_PACKAGE_NAME ${name})
    set(CPACK_DEBIAN_${upper}_PACKAGE_SECTION ${section})
    set(CPACK_DEBIAN_${upper}_PACKAGE_DEPENDS "${depends}")
    set(CPACK_DEBIAN_${upper}_DESCRIPTION "${summary}\n${text}")
endmacro()

# dbus-glib is loaded when an object is served: what looks for dependencies does not find it.
kesbluetooth_package(runtime ${library} libs "libdbus-glib-1-2" "Client library for the BlueZ 4 Bluetooth daemon"
"Proxies for the manager, adapters, devices and their audio and remote-control
interfaces over D-Bus, a pairing agent, and a scan that programs share.")
# CPack adds scripts that call ldconfig unless there are others; these do not exist, so none are added.
set(CPACK_DEBIAN_RUNTIME_PACKAGE_CONTROL_EXTRA
    ${debianFiles}/runtime/triggers ${debianFiles}/runtime/postinst ${debianFiles}/runtime/postrm)

kesbluetooth_package(dev libkesbluetooth-dev libdevel
    "${library} (= ${version}), libdbus-1-dev, libdbus-glib-1-dev, libboost-dev"
    "Client library for the BlueZ 4 Bluetooth daemon - development files"
"Headers, the CMake package kesbluetooth, the pkg-config file and the manual
page kesbluetooth(7). bluez4-sim lets programs be tried without hardware.")
set(CPACK_DEBIAN_DEV_PACKAGE_SUGGESTS "libkesbluetooth-doc, bluez4-sim")

kesbluetooth_package(doc libkesbluetooth-doc doc ""
    "Client library for the BlueZ 4 Bluetooth daemon - documentation"
"The reference of all classes and functions, pages on tasks, on the programs and
on threads and lifetimes, and six small programs to begin with.")
set(CPACK_DEBIAN_DOC_PACKAGE_ARCHITECTURE all)

kesbluetooth_package(kesbt kesbt utils "${library} (>= ${PROJECT_VERSION})"
    "Bluetooth from the command line, through BlueZ 4"
"Shows adapters and devices, finds and pairs devices, connects headsets, answers
pairing requests and keeps the auto-connect lists; for people and, with --json,
for programs.")
set(CPACK_DEBIAN_KESBT_PACKAGE_RECOMMENDS kesbt-scannerd)
set(CPACK_DEBIAN_KESBT_PACKAGE_SUGGESTS "kesbt-autoconnectd, bluez4-sim")

kesbluetooth_package(scannerd kesbt-scannerd utils "${library} (>= ${PROJECT_VERSION})"
    "Bluetooth discovery that programs share"
"Runs the discovery of BlueZ 4's daemon for several programs at once. The
session bus starts it when it is asked.")
set(CPACK_DEBIAN_SCANNERD_PACKAGE_RECOMMENDS "default-dbus-session-bus | dbus-session-bus")

kesbluetooth_package(autoconnectd kesbt-autoconnectd utils "${library} (>= ${PROJECT_VERSION})"
    "Connects listed Bluetooth devices whenever they are in reach"
"Headsets of the auto-connect lists are connected as they appear. The service
is not enabled by the installation.")
set(maintainer ${debianFiles}/autoconnectd)
set(CPACK_DEBIAN_AUTOCONNECTD_PACKAGE_CONTROL_EXTRA
    ${maintainer}/postinst ${maintainer}/prerm ${maintainer}/postrm)

kesbluetooth_package(sim bluez4-sim devel "dbus-daemon | dbus, libglib2.0-bin"
    "Simulated BlueZ 4 Bluetooth daemon"
"Behaves on D-Bus as BlueZ 4.101 does, with adapters and devices that are told
what to do: Bluetooth programs can be tried and tested without hardware.")
set(CPACK_DEBIAN_SIM_PACKAGE_RECOMMENDS "kesbt, kesbt-scannerd, kesbt-autoconnectd")

# What only packages have.
if(CMAKE_INSTALL_PREFIX STREQUAL /usr)
    # The library makes the last folder of its lists, not those above.
    install(DIRECTORY DESTINATION /etc/bluetooth COMPONENT runtime)
    # Compressed without name and time: the same file gives the same bytes.
    execute_process(COMMAND gzip -9nc ${debianFiles}/changelog
        OUTPUT_FILE ${PROJECT_BINARY_DIR}/changelog.Debian.gz COMMAND_ERROR_IS_FATAL ANY)
    execute_process(COMMAND gzip -9nc ${PROJECT_SOURCE_DIR}/CHANGELOG.md
        OUTPUT_FILE ${PROJECT_BINARY_DIR}/changelog.gz COMMAND_ERROR_IS_FATAL ANY)
    foreach(component IN LISTS CPACK_COMPONENTS_ALL)
        string(TOUPPER ${component} upper)
        install(FILES ${debianFiles}/copyright
            ${PROJECT_BINARY_DIR}/changelog.Debian.gz ${PROJECT_BINARY_DIR}/changelog.gz
            DESTINATION share/doc/${CPACK_DEBIAN_${upper}_PACKAGE_NAME} COMPONENT ${component})
    endforeach()
    if(KESBLUETOOTH_BUILD_DOCS)
        install(FILES ${debianFiles}/doc/libkesbluetooth-doc.kesbluetooth
            DESTINATION share/doc-base COMPONENT doc)
    endif()
endif()

include(CPack)
