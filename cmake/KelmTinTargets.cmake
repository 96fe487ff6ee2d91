# How our own targets are compiled. Everything here is set on targets: a host that adds this project
# as a subdirectory keeps its own flags.

# Every target that does or checks arithmetic goes through this function.
function(kelm_tin_compile_options target)
  # Results must agree to the bit between compilers, optimisation levels and processors. A fused
  # multiply-add rounds once where the source rounds twice, and whether one is used depends on
  # compiler and flags; -ffast-math in a host's flags would reorder sums and drop NaN tests.
  target_compile_options(${target} PRIVATE -fno-fast-math -ffp-contract=off)

  target_compile_options(${target} PRIVATE -Wall -Wextra -Wpedantic -Wshadow -Wconversion
                                           -Wdouble-promotion)
  set_target_properties(${target} PROPERTIES
    CXX_EXTENSIONS OFF
    CXX_VISIBILITY_PRESET hidden
    VISIBILITY_INLINES_HIDDEN ON
    COMPILE_WARNING_AS_ERROR ${KELM_TIN_WERROR})
endfunction()

# A library that programs link: file name, version and soname, and calls inside the library that the
# compiler may inline although the function is exported.
function(kelm_tin_library target output_name)
  kelm_tin_compile_options(${target})
  target_compile_options(${target} PRIVATE -fno-semantic-interposition)
  # Classes stand in the binary interface, so it may change with each minor version before 1.0.
  set_target_properties(${target} PROPERTIES
    OUTPUT_NAME ${output_name}
    VERSION ${PROJECT_VERSION}
    SOVERSION ${PROJECT_VERSION_MAJOR}.${PROJECT_VERSION_MINOR}
    POSITION_INDEPENDENT_CODE ON)
endfunction()

# Link-time optimisation in the optimised configurations. Not for a static library, whose objects
# would then ask for the same compiler in every program that links them.
function(kelm_tin_enable_ipo target)
  get_target_property(type ${target} TYPE)
  if(NOT KELM_TIN_IPO OR NOT type STREQUAL "SHARED_LIBRARY")
    return()
  endif()
  include(CheckIPOSupported)
  check_ipo_supported(RESULT supported LANGUAGES CXX)
  if(supported)
    set_target_properties(${target} PROPERTIES
      INTERPROCEDURAL_OPTIMIZATION_RELEASE ON
      INTERPROCEDURAL_OPTIMIZATION_RELWITHDEBINFO ON)
  endif()
endfunction()

# Links what no user of a library sees. An installed shared library would name an imported shared one
# to its users, who would have to find it: so it is linked by its file.
function(kelm_tin_link_hidden target dependency)
  get_target_property(type ${target} TYPE)
  get_target_property(dependency_type ${dependency} TYPE)
  if(type STREQUAL "SHARED_LIBRARY" AND dependency_type STREQUAL "SHARED_LIBRARY")
    target_include_directories(${target} SYSTEM PRIVATE
      $<TARGET_PROPERTY:${dependency},INTERFACE_INCLUDE_DIRECTORIES>)
    target_link_libraries(${target} PRIVATE $<TARGET_LINKER_FILE:${dependency}>)
  else()
    target_link_libraries(${target} PRIVATE ${dependency})
  endif()
endfunction()
