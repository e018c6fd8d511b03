# A program of its own: it sees the public header and links libsecpolicy.so, nothing of its objects.
add_executable(package_consumer "${CMAKE_CURRENT_LIST_DIR}/exception_border_test.cpp")
target_include_directories(package_consumer PRIVATE "${PROJECT_SOURCE_DIR}/tests")
target_link_libraries(package_consumer PRIVATE secpolicy GTest::gtest GTest::gtest_main)
gtest_discover_tests(package_consumer DISCOVERY_MODE PRE_TEST)

# What the dynamic linker shows: one line more or less is a changed promise. Unoptimised, clang shows
# instances of templates as well.
if(NOT SECPOLICY_SANITIZE)
  add_test(NAME package.exported_symbols
    COMMAND "${CMAKE_CURRENT_LIST_DIR}/check-exported-symbols"
      "$<TARGET_FILE:secpolicy>" "${CMAKE_CURRENT_LIST_DIR}/exported_symbols.txt")

  add_test(NAME package.host_symbols
    COMMAND "${CMAKE_CURRENT_LIST_DIR}/check-host-symbols" "$<TARGET_FILE:secpolicyhost>")
endif()

# What it needs at run time: the host, the C++ runtime and the C library.
add_test(NAME package.needed_libraries
  COMMAND "${CMAKE_CURRENT_LIST_DIR}/check-needed-libraries" "$<TARGET_FILE:secpolicy>")

# What a boot alone needs is loaded by a boot alone, what signs by the verb that does, and what tells the
# kernel where that keeps the policy.
if(TARGET secpolicy_module)
  set(module_library "$<TARGET_FILE:secpolicy_module>")
endif()
add_test(NAME package.late_libraries
  COMMAND "${CMAKE_CURRENT_LIST_DIR}/check-late-libraries"
    "$<TARGET_FILE:secpolicy_cli>" "$<TARGET_FILE:secpolicyhost>" "$<TARGET_FILE:secpolicyhost_archive>"
    "$<TARGET_FILE:secpolicy_signature>" ${module_library})
