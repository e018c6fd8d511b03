# What programs that are linked to the library rely on. Types are told by debug information, which -g1
# has too little of, and clang tells of destructors in another way; the instrumented builds are not
# what is shipped.
if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU" AND NOT SECPOLICY_SANITIZE AND NOT SECPOLICY_COVERAGE AND NOT SECPOLICY_FUZZ)
  target_compile_options(secpolicy_objects PRIVATE -g)
  add_test(NAME abi COMMAND "${CMAKE_CURRENT_SOURCE_DIR}/abi_test" "$<TARGET_FILE:secpolicy>")
  set_tests_properties(abi PROPERTIES SKIP_RETURN_CODE 77)
endif()
