# SPDX-License-Identifier: LGPL-2.1-or-later
# What an installation holds. Components: runtime (the library), dev, doc, sim, and
# one for each program: kesbt, scannerd, autoconnectd.
include(CMakePackageConfigHelpers)

install(TARGETS kesbluetooth EXPORT kesbluetoothTargets
    LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR} COMPONENT runtime NAMELINK_COMPONENT dev)
install(DIRECTORY include/bluetooth DESTINATION ${CMAKE_INSTALL_INCLUDEDIR} COMPONENT dev
    FILES_MATCHING PATTERN "*.h")

set(cmakeDir ${CMAKE_INSTALL_LIBDIR}/cmake/kesbluetooth)
install(EXPORT kesbluetoothTargets NAMESPACE kesbluetooth:: DESTINATION ${cmakeDir} COMPONENT dev)
configure_package_config_file(cmake/kesbluetoothConfig.cmake.in
    ${PROJECT_BINARY_DIR}/kesbluetoothConfig.cmake INSTALL_DESTINATION ${cmakeDir})
write_basic_package_version_file(${PROJECT_BINARY_DIR}/kesbluetoothConfigVersion.cmake
    COMPATIBILITY SameMajorVersion)
install(FILES
    ${PROJECT_BINARY_DIR}/kesbluetoothConfig.cmake
    ${PROJECT_BINARY_DIR}/kesbluetoothConfigVersion.cmake
    DESTINATION ${cmakeDir} COMPONENT dev)

# The prefix is told from where the file lies, so that --prefix at installation works.
file(RELATIVE_PATH pcToPrefix /p/${CMAKE_INSTALL_LIBDIR}/pkgconfig /p)
string(REGEX REPLACE "/$" "" pcToPrefix "${pcToPrefix}")
configure_file(cmake/kesbluetooth.pc.in ${PROJECT_BINARY_DIR}/kesbluetooth.pc @ONLY)
install(FILES ${PROJECT_BINARY_DIR}/kesbluetooth.pc
    DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig COMPONENT dev)
