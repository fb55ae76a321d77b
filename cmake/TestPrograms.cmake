# Test programs; each runs in its own sandbox (tests/support/).
include(GoogleTest)

# Optimising the tests would take most of the build time.
set(VELA_TEST_OPTIONS -O0)
# The behaviour of the tests' own code is not examined, which would take a third of the build time.
# AddressSanitizer stays: it has to know the variables that the product's code is given.
if(VELA_BUILD_FUZZERS)
  list(APPEND VELA_TEST_OPTIONS -fno-sanitize=all)  # built only for the compiler's warnings
elseif(VELA_SANITIZE)
  list(APPEND VELA_TEST_OPTIONS -fno-sanitize=undefined)
endif()
# The rows of test tables begin with the name that their base class holds; braces around it alone
# would only make them harder to read.
if(CMAKE_CXX_COMPILER_ID STREQUAL "Clang")
  list(APPEND VELA_TEST_OPTIONS -Wno-missing-braces)
endif()

# Adds a test program with the given sources. It links the library and the test support, and reuses
# the precompiled test framework headers of tests/CMakeLists.txt.
function(vela_add_test_program name)
  add_executable(${name} ${ARGN})
  target_link_libraries(${name} PRIVATE vela_test_support velathumb_library)
  target_compile_options(${name} PRIVATE ${VELA_TEST_OPTIONS})
  target_precompile_headers(${name} REUSE_FROM vela_test_headers)
  add_dependencies(${name} velathumb convert-thumb vela_stub_tool)
  gtest_discover_tests(${name} TEST_PREFIX ${name}. DISCOVERY_TIMEOUT 60
                       PROPERTIES TIMEOUT 600 ${VELA_TEST_PROPERTIES})
endfunction()

# Registers the tests of `name` that match `filter` again, with ImageMagick as the real converter.
function(vela_add_imagemagick_tests name filter)
  gtest_discover_tests(${name} TEST_PREFIX imagemagick.${name}. TEST_LIST ${name}_imagemagick
                       TEST_FILTER ${filter} DISCOVERY_TIMEOUT 60
                       PROPERTIES TIMEOUT 600 ENVIRONMENT VELA_TEST_CONVERTER=imagemagick)
endfunction()
