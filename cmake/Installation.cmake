# What is installed besides the programs and bundles, which say so in their own folders: the two
# libraries that a host, the plug-in and other bundles share, the account settings library and the device
# image for programs that link them, and what compilers and build systems need for that. The component
# runtime runs alone; development needs runtime, and documentation nothing.
include(CMakePackageConfigHelpers)
set(package_directory ${CMAKE_INSTALL_LIBDIR}/cmake/AccountRetirement)
set(header_directory ${CMAKE_INSTALL_INCLUDEDIR}/account-retirement)
set(resources_directory
    ${CMAKE_INSTALL_LIBDIR}/account-retirement/migrators/QuillnetAccountRemoval.migrator)
set(services_directory ${CMAKE_INSTALL_LIBDIR}/account-retirement/services)

install(
  TARGETS propertylist platform
  EXPORT AccountRetirementTargets
  LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR} COMPONENT runtime NAMELINK_COMPONENT development
  INCLUDES DESTINATION ${header_directory})
install(TARGETS account_settings EXPORT AccountRetirementTargets
        ARCHIVE DESTINATION ${CMAKE_INSTALL_LIBDIR} COMPONENT development)
install(TARGETS deviceimage EXPORT AccountRetirementDeviceImageTargets
        ARCHIVE DESTINATION ${CMAKE_INSTALL_LIBDIR} COMPONENT development)

install(
  DIRECTORY propertylist platform
  DESTINATION ${header_directory}
  COMPONENT development
  FILES_MATCHING
  PATTERN "*.h"
  PATTERN "testing" EXCLUDE)
# Without what the library keeps to itself.
install(
  DIRECTORY QuillnetAccountTypeRemoval localdata
  DESTINATION ${header_directory}
  COMPONENT development
  FILES_MATCHING
  PATTERN "*.h"
  PATTERN "Assertions.h" EXCLUDE
  PATTERN "BundleAnchor.h" EXCLUDE
  PATTERN "ProcessLookup.h" EXCLUDE
  PATTERN "PropertyNumbers.h" EXCLUDE
  PATTERN "SettingsFileWriting.h" EXCLUDE)
install(
  FILES deviceimage/DeviceImage.h deviceimage/DeviceImageServices.h deviceimage/ImageLock.h
  DESTINATION ${header_directory}/deviceimage
  COMPONENT development)

foreach(set IN ITEMS AccountRetirementTargets AccountRetirementDeviceImageTargets)
  install(
    EXPORT ${set}
    NAMESPACE AccountRetirement::
    DESTINATION ${package_directory}
    COMPONENT development)
endforeach()
# The same names in the tree, for the examples.
foreach(target IN ITEMS propertylist platform account_settings deviceimage)
  add_library(AccountRetirement::${target} ALIAS ${target})
endforeach()
configure_package_config_file(
  cmake/AccountRetirementConfig.cmake.in ${PROJECT_BINARY_DIR}/AccountRetirementConfig.cmake
  INSTALL_DESTINATION ${package_directory}
  PATH_VARS resources_directory services_directory)
write_basic_package_version_file(${PROJECT_BINARY_DIR}/AccountRetirementConfigVersion.cmake
                                 COMPATIBILITY SameMinorVersion)
install(
  FILES ${PROJECT_BINARY_DIR}/AccountRetirementConfig.cmake
        ${PROJECT_BINARY_DIR}/AccountRetirementConfigVersion.cmake
  DESTINATION ${package_directory}
  COMPONENT development)

# pkg-config finds the prefix from its own file, so that an installation can be moved.
file(RELATIVE_PATH prefix_from_pkgconfig ${CMAKE_INSTALL_FULL_LIBDIR}/pkgconfig
     ${CMAKE_INSTALL_PREFIX})
foreach(kind IN ITEMS LIBDIR INCLUDEDIR)
  string(TOLOWER pkgconfig_${kind} variable)
  if(IS_ABSOLUTE ${CMAKE_INSTALL_${kind}})
    set(${variable} ${CMAKE_INSTALL_${kind}})
  else()
    set(${variable} \${prefix}/${CMAKE_INSTALL_${kind}})
  endif()
endforeach()
# install_pkgconfig(<file> <name> <libraries> <requires>), with the description in package_description
function(install_pkgconfig file package_name package_libraries package_requires)
  configure_file(cmake/package.pc.in ${PROJECT_BINARY_DIR}/${file}.pc @ONLY)
  install(
    FILES ${PROJECT_BINARY_DIR}/${file}.pc
    DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig
    COMPONENT development)
endfunction()
set(package_description "Interfaces of the device, the class registry, and property lists")
install_pkgconfig(account-retirement-platform "Account retirement, platform"
                  "-laccount-retirement-platform -laccount-retirement-propertylist" "")
set(package_description "The account settings library")
install_pkgconfig(account-retirement "Account retirement" -laccount_settings
                  "account-retirement-platform = ${PROJECT_VERSION}")
set(package_description "Every service of the device over a directory")
install_pkgconfig(account-retirement-deviceimage "Account retirement, device image" -ldeviceimage
                  "account-retirement-platform = ${PROJECT_VERSION}, sqlite3, nettle")

install(
  FILES LICENSE README.md CHANGELOG.md CONTRIBUTING.md
  DESTINATION ${CMAKE_INSTALL_DOCDIR}
  COMPONENT documentation)
install(
  DIRECTORY docs
  DESTINATION ${CMAKE_INSTALL_DOCDIR}
  COMPONENT documentation
  FILES_MATCHING
  PATTERN "*.md"
  PATTERN "*.json"
  PATTERN "*.svg"
  PATTERN "man" EXCLUDE)
install(
  DIRECTORY examples/notifier examples/rename-account
  DESTINATION ${CMAKE_INSTALL_DOCDIR}/examples
  COMPONENT documentation)
