# What programs that are linked to the library rely on. Types are told by debug information; the
# instrumented builds are not what is shipped.
if(NOT SECPOLICY_SANITIZE AND NOT SECPOLICY_COVERAGE AND NOT SECPOLICY_FUZZ)
  add_test(NAME abi COMMAND "${CMAKE_CURRENT_SOURCE_DIR}/abi_test" "$<TARGET_FILE:secpolicy>")
  set_tests_properties(abi PROPERTIES SKIP_RETURN_CODE 77)
endif()
