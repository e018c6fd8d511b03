# To read the standard headers is a good part of what a unit costs. For a build from nothing they can
# be precompiled; a compiler cache does better without.
option(SECPOLICY_PRECOMPILE "Precompile the standard headers that most units include" OFF)

# For a target that is compiled as `other` is.
function(share_precompiled_headers target other)
  if(SECPOLICY_PRECOMPILE)
    target_precompile_headers(${target} REUSE_FROM ${other})
  endif()
endfunction()

# All targets that are no programs of their own are compiled alike, and so read the same.
function(precompile_standard_headers target)
  if(SECPOLICY_PRECOMPILE AND NOT TARGET standard_headers)
    file(WRITE "${PROJECT_BINARY_DIR}/standard_headers.cpp" "")
    add_library(standard_headers OBJECT "${PROJECT_BINARY_DIR}/standard_headers.cpp")
    target_precompile_headers(standard_headers PRIVATE
      <algorithm> <array> <cerrno> <cstring> <exception> <filesystem> <fstream> <functional> <iostream>
      <map> <memory> <optional> <set> <sstream> <stdexcept> <string> <string_view> <variant> <vector>)
  endif()
  share_precompiled_headers(${target} standard_headers)
endfunction()

# Where a unity build is asked for, the sources of a folder below that of the target are compiled as one.
# Those beside the target are compiled alone, as tests are: each may have the same names for what is its
# own.
set(joins_folders ${CMAKE_UNITY_BUILD})
set(CMAKE_UNITY_BUILD OFF)
function(join_folders target)
  if(NOT joins_folders)
    return()
  endif()
  get_target_property(sources ${target} SOURCES)
  set_target_properties(${target} PROPERTIES UNITY_BUILD ON UNITY_BUILD_MODE GROUP)
  foreach(source ${sources})
    if(source MATCHES "\\.cpp$" AND NOT IS_ABSOLUTE "${source}")
      cmake_path(GET source PARENT_PATH folder)
      if(folder)
        set_source_files_properties("${source}" PROPERTIES UNITY_GROUP "${folder}")
      endif()
    endif()
  endforeach()
endfunction()
