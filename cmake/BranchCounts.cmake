# Test programs count which branches of the source they reach, in the floors on which the promises of
# docs/reliability.md stand; row Q1 of tests/faults/run reads what they leave in profiles/ of the build folder. Other
# programs keep nothing. A static library's users bring the counting along; a shared one has its own.
# Names are relative, so that a compiler cache may serve several folders.
set(counting -fprofile-instr-generate=/dev/null -fcoverage-compilation-dir=.)
foreach(floor IN ITEMS propertylist platform account_settings migrator deviceimage)
  target_compile_options(${floor} PRIVATE ${counting} -fcoverage-mapping)
  get_target_property(kind ${floor} TYPE)
  if(kind STREQUAL "STATIC_LIBRARY")
    target_link_options(${floor} INTERFACE ${counting})
  else()
    target_link_options(${floor} PRIVATE ${counting})
  endif()
endforeach()
