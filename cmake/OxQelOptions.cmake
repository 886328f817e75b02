# Compiler settings shared by every target of the project.
add_library(oxqel_warnings INTERFACE)
target_compile_options(oxqel_warnings INTERFACE -Wall -Wextra -Wpedantic)
if(OXQEL_WERROR)
  target_compile_options(oxqel_warnings INTERFACE -Werror)
endif()

if(OXQEL_SANITIZE)
  add_compile_options(-fsanitize=${OXQEL_SANITIZE} -fno-omit-frame-pointer -fno-sanitize-recover=all)
  add_link_options(-fsanitize=${OXQEL_SANITIZE})
endif()

# Headers are included as "platform/core/OxVariant.h", "OxQelLib/sqlite/...": from the
# source root while building, from include/oxqel once installed.
function(oxqel_public_includes target)
  target_include_directories(${target} PUBLIC
    $<BUILD_INTERFACE:${PROJECT_SOURCE_DIR}>
    $<INSTALL_INTERFACE:${CMAKE_INSTALL_INCLUDEDIR}/oxqel>)
endfunction()

# Fuzz builds instrument every target for coverage; the fuzz targets link libFuzzer.
if(OXQEL_BUILD_FUZZ)
  if(NOT CMAKE_CXX_COMPILER_ID STREQUAL "Clang")
    message(FATAL_ERROR "OXQEL_BUILD_FUZZ needs clang (CXX=clang++)")
  endif()
  add_compile_options(-fsanitize=fuzzer-no-link)
endif()
