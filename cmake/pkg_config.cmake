# tuvo_pkg_config(<name>): makes <name>.pc of cmake/<name>.pc.in and installs it.
function(tuvo_pkg_config name)
  # Programs need no run path to where the loader looks anyway.
  set(pc_run_path " -Wl,-rpath,\${libdir}")
  if(CMAKE_INSTALL_FULL_LIBDIR IN_LIST CMAKE_CXX_IMPLICIT_LINK_DIRECTORIES)
    set(pc_run_path "")
  endif()
  configure_file("${PROJECT_SOURCE_DIR}/cmake/${name}.pc.in" "${PROJECT_BINARY_DIR}/${name}.pc"
                 @ONLY)
  install(FILES "${PROJECT_BINARY_DIR}/${name}.pc" DESTINATION "${CMAKE_INSTALL_LIBDIR}/pkgconfig")
endfunction()
