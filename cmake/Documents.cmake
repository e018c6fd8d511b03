# Installs documents, each in its place, so that links between them lead on.
function(install_documents directory)
  foreach(document IN LISTS ARGN)
    get_filename_component(place "${document}" DIRECTORY)
    install(FILES "${PROJECT_SOURCE_DIR}/${document}" DESTINATION "${directory}/${place}")
  endforeach()
  install(CODE "set(documents \"\$ENV{DESTDIR}\${CMAKE_INSTALL_PREFIX}/${directory}\")")
  install(SCRIPT "${PROJECT_SOURCE_DIR}/cmake/UnlinkDocuments.cmake")
endfunction()
