# What is installed besides the programs and the plug-in's bundle, which say so in their own folders:
# the two libraries that a host, the plug-in and other bundles share, and their headers.
install(TARGETS propertylist platform LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR} COMPONENT runtime)
install(
  DIRECTORY propertylist platform
  DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}/account-retirement
  COMPONENT development
  FILES_MATCHING
  PATTERN "*.h"
  PATTERN "testing" EXCLUDE)
install(
  FILES LICENSE README.md CHANGELOG.md
  DESTINATION ${CMAKE_INSTALL_DOCDIR}
  COMPONENT documentation)
install(
  DIRECTORY docs/
  DESTINATION ${CMAKE_INSTALL_DOCDIR}
  COMPONENT documentation
  FILES_MATCHING
  PATTERN "*.md"
  PATTERN "*.json"
  PATTERN "man" EXCLUDE)
