# Header-only libraries of the build machine (CLI11 for the tool,
# nlohmann-json for its tests) in a cross build. Their folders are linked into
# one of the build tree that holds nothing else, so the cross compiler never
# sees the machine's own C headers, and a package file for each points there
# (found through <package>_DIR).
set(TOVA_HOST_INCLUDE /usr/include CACHE PATH "Where the build machine keeps CLI11 and nlohmann-json")
function(tova_host_header_package package target folder)
  set(root ${CMAKE_BINARY_DIR}/host-headers)
  if(NOT EXISTS ${TOVA_HOST_INCLUDE}/${folder})
    return()
  endif()
  file(MAKE_DIRECTORY ${root}/include ${root}/${package})
  if(NOT EXISTS ${root}/include/${folder})
    file(CREATE_LINK ${TOVA_HOST_INCLUDE}/${folder} ${root}/include/${folder} SYMBOLIC)
  endif()
  file(WRITE ${root}/${package}/${package}Config.cmake
    "if(NOT TARGET ${target})\n"
    "  add_library(${target} INTERFACE IMPORTED)\n"
    "  set_target_properties(${target} PROPERTIES INTERFACE_INCLUDE_DIRECTORIES ${root}/include)\n"
    "endif()\n")
  set(${package}_DIR ${root}/${package} CACHE PATH "" FORCE)
endfunction()
tova_host_header_package(CLI11 CLI11::CLI11 CLI)
tova_host_header_package(nlohmann_json nlohmann_json::nlohmann_json nlohmann)
