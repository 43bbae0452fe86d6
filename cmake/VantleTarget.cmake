# vantle_library(NAME [dependencies...]): the static library of one source folder.
# Its sources are the folder's *.cpp files; its public dependencies are exactly those named.
# Includes are written from src/ ("ssc/Client.h"), so that a reader sees the folder.
function(vantle_library name)
  file(GLOB sources CONFIGURE_DEPENDS ${CMAKE_CURRENT_SOURCE_DIR}/*.cpp)
  add_library(${name} STATIC ${sources})
  target_include_directories(${name} PUBLIC ${PROJECT_SOURCE_DIR}/src)
  target_link_libraries(${name} PUBLIC ${ARGN})
  set_property(GLOBAL APPEND PROPERTY VANTLE_LIBRARIES ${name})
  vantle_lint(${name})
endfunction()

# vantle_lint(TARGET): clang-tidy for a target of our own code, when asked for.
function(vantle_lint name)
  if(VANTLE_BUILD_TIDY)
    set_target_properties(${name} PROPERTIES CXX_CLANG_TIDY "${CLANG_TIDY_PROGRAM};--quiet")
  endif()
endfunction()
