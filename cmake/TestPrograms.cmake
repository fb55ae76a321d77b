# Test programs; every one runs in a sandbox of its own (tests/support/).
include(GoogleTest)

# Most of the time of a build would go into optimising the tests themselves.
set(VELA_TEST_OPTIONS -O0)

# Adds a test program of the given sources. It links the library and the test support, and takes the
# headers of the test framework that tests/CMakeLists.txt compiles once for all.
function(vela_add_test_program name)
  add_executable(${name} ${ARGN})
  target_link_libraries(${name} PRIVATE vela_test_support velathumb_library)
  target_compile_options(${name} PRIVATE ${VELA_TEST_OPTIONS})
  target_precompile_headers(${name} REUSE_FROM vela_test_headers)
  add_dependencies(${name} velathumb convert-thumb vela_stub_tool)
  gtest_discover_tests(${name} TEST_PREFIX ${name}. DISCOVERY_TIMEOUT 60
                       PROPERTIES TIMEOUT 600 ${VELA_TEST_PROPERTIES})
endfunction()

# Registers the tests of `name` that match `filter` once more, with ImageMagick as the real converter.
function(vela_add_imagemagick_tests name filter)
  gtest_discover_tests(${name} TEST_PREFIX imagemagick.${name}. TEST_LIST ${name}_imagemagick
                       TEST_FILTER ${filter} DISCOVERY_TIMEOUT 60
                       PROPERTIES TIMEOUT 600 ENVIRONMENT VELA_TEST_CONVERTER=imagemagick)
endfunction()
