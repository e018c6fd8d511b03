# What programs that are linked to the library rely on. Types are told by debug information, which -g1
# has too little of; the instrumented builds are not what is shipped.
if(NOT SECPOLICY_SANITIZE AND NOT SECPOLICY_COVERAGE AND NOT SECPOLICY_FUZZ)
  target_compile_options(secpolicy_objects PRIVATE -g)
  add_test(NAME abi COMMAND "${CMAKE_CURRENT_SOURCE_DIR}/abi_test" "$<TARGET_FILE:secpolicy>")
  set_tests_properties(abi PROPERTIES SKIP_RETURN_CODE 77)
endif()
