# The target coverage-report runs every test and prints the lines and branches that they reach. Branches
# that only an exception of the standard library would take are left out.
find_program(GCOVR gcovr)
if(NOT GCOVR)
  message(FATAL_ERROR "The coverage preset needs gcovr; install the Debian package gcovr")
endif()
set(filters "")
foreach(floor IN ITEMS propertylist platform QuillnetAccountTypeRemoval localdata migrator deviceimage
                       accountservices accountsdatamigrator host tools)
  list(APPEND filters --filter ${floor}/)
endforeach()
add_custom_target(
  coverage-report
  COMMAND find ${PROJECT_BINARY_DIR} -name "*.gcda" -delete
  COMMAND ${CMAKE_CTEST_COMMAND} --test-dir ${PROJECT_BINARY_DIR} -j2 --output-on-failure
  COMMAND ${GCOVR} --root ${PROJECT_SOURCE_DIR} --object-directory ${PROJECT_BINARY_DIR} ${filters}
          --exclude-throw-branches --sort-percentage
  COMMAND ${GCOVR} --root ${PROJECT_SOURCE_DIR} --object-directory ${PROJECT_BINARY_DIR} ${filters}
          --exclude-throw-branches --sort-percentage --branches
  WORKING_DIRECTORY ${PROJECT_SOURCE_DIR}
  VERBATIM)
