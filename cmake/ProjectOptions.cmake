# How every target of the project is built: warnings are errors with both compilers, sanitizers and
# coverage are switched on by the presets.

option(PROJECT_WERROR "Treat warnings as errors" ON)
set(PROJECT_SANITIZE "" CACHE STRING "Sanitizers, as -fsanitize takes them (address,undefined or thread)")
option(PROJECT_COVERAGE "Measure coverage" OFF)

add_library(project_options INTERFACE)
target_include_directories(project_options INTERFACE ${PROJECT_SOURCE_DIR})
target_compile_options(
  project_options
  INTERFACE -Wall
            -Wextra
            -Wpedantic
            -Wshadow
            -Wconversion
            -Wsign-conversion
            -Wnon-virtual-dtor
            -Woverloaded-virtual
            -Wcast-align
            -Wold-style-cast
            $<$<BOOL:${PROJECT_WERROR}>:-Werror>
            # g++ 12 warns of std::string's own operator+ where it inlines it.
            $<$<CXX_COMPILER_ID:GNU>:-Wno-restrict>)
if(PROJECT_SANITIZE)
  target_compile_options(project_options INTERFACE -fsanitize=${PROJECT_SANITIZE} -fno-sanitize-recover=all
                                                   -fno-omit-frame-pointer)
  target_link_options(project_options INTERFACE -fsanitize=${PROJECT_SANITIZE})
endif()
# gcov counts branches of the machine's code, among them those that destroy temporaries. Clang counts branches
# of the source: cmake/BranchCounts.cmake.
if(PROJECT_COVERAGE AND CMAKE_CXX_COMPILER_ID STREQUAL "GNU")
  target_compile_options(project_options INTERFACE --coverage)
  target_link_options(project_options INTERFACE --coverage)
endif()

# Everything built lies where its users look for it, so that the build tree runs like an installation.
set(CMAKE_RUNTIME_OUTPUT_DIRECTORY ${PROJECT_BINARY_DIR}/bin)
set(CMAKE_LIBRARY_OUTPUT_DIRECTORY ${PROJECT_BINARY_DIR}/lib)
set(PROJECT_MIGRATORS_DIRECTORY ${PROJECT_BINARY_DIR}/lib/account-retirement/migrators)
set(PROJECT_SERVICES_DIRECTORY ${PROJECT_BINARY_DIR}/lib/account-retirement/services)
set(CMAKE_INSTALL_RPATH $ORIGIN $ORIGIN/../${CMAKE_INSTALL_LIBDIR} $ORIGIN/../lib $ORIGIN/../../..)
list(REMOVE_DUPLICATES CMAKE_INSTALL_RPATH)
# A path that is replaced at installation ends with an empty entry, which is the current directory.
set(CMAKE_BUILD_WITH_INSTALL_RPATH ON)

# shared_library(<target>) names a library that stays loaded in other people's processes: its file says
# whose it is, and what was built for another version of the package does not load with it.
function(shared_library target)
  set_target_properties(
    ${target}
    PROPERTIES OUTPUT_NAME account-retirement-${target}
               VERSION ${PROJECT_VERSION}
               SOVERSION ${PROJECT_VERSION_MAJOR}.${PROJECT_VERSION_MINOR})
endfunction()

# project_test(<name> <source>... LIBRARIES <target>...) builds one GoogleTest program. CTest runs each
# of its cases in a process of its own, because much of the state under test is kept per process.
function(project_test name)
  cmake_parse_arguments(PARSE_ARGV 1 arg "" "" "LIBRARIES")
  add_executable(${name} ${arg_UNPARSED_ARGUMENTS})
  target_link_libraries(${name} PRIVATE project_options ${arg_LIBRARIES} GTest::gtest GTest::gmock
                                        GTest::gtest_main)
  # Optimising a test costs minutes of building and saves seconds of running.
  target_compile_options(${name} PRIVATE -O0)
  target_compile_definitions(${name} PRIVATE TEST_DATA_DIR="${PROJECT_SOURCE_DIR}/tests/data")
  set(environment "")
  if(PROJECT_COVERAGE AND CMAKE_CXX_COMPILER_ID STREQUAL "Clang")
    set(environment ENVIRONMENT LLVM_PROFILE_FILE=${PROJECT_BINARY_DIR}/profiles/%4m.profraw)
  endif()
  gtest_discover_tests(${name} TEST_PREFIX ${name}. DISCOVERY_TIMEOUT 60
                       PROPERTIES TIMEOUT 120 ${environment})
endfunction()
