# How the shipped files are protected. The sanitizers' builds are protected otherwise.
if(NOT SECPOLICY_SANITIZE AND NOT SECPOLICY_COVERAGE AND NOT SECPOLICY_FUZZ)
  add_test(NAME hardening
    COMMAND "${CMAKE_CURRENT_SOURCE_DIR}/hardening_test" "${CMAKE_BINARY_DIR}" "$<CONFIG>"
      "${CMAKE_CXX_COMPILER_ID}")
  set_tests_properties(hardening PROPERTIES SKIP_RETURN_CODE 77)
endif()
