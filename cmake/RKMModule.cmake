# Build flags shared by every target of the project, library and tests alike.
add_library(rkm_build_flags INTERFACE)
target_compile_features(rkm_build_flags INTERFACE cxx_std_17)
target_compile_options(rkm_build_flags INTERFACE -Wall -Wextra)
if(RKM_WARNINGS_AS_ERRORS)
  target_compile_options(rkm_build_flags INTERFACE -Werror)
endif()
if(RKM_SANITIZE)
  list(JOIN RKM_SANITIZE "," _rkm_san)
  target_compile_options(rkm_build_flags INTERFACE -fsanitize=${_rkm_san} -fno-sanitize-recover=all -fno-omit-frame-pointer)
  target_link_options(rkm_build_flags INTERFACE -fsanitize=${_rkm_san} -fno-sanitize-recover=all)
  if("thread" IN_LIST RKM_SANITIZE)
    # ThreadSanitizer does not model standalone fences and says so; the code it checks relies on
    # atomics for ordering, the fences are extra.
    target_compile_options(rkm_build_flags INTERFACE -Wno-tsan)
  endif()
endif()

set_property(GLOBAL PROPERTY RKM_MODULES "")

# The folder of a module's public headers: the platform layer keeps its own, every other module has
# one under ProtectedInterfaces/.
function(rkm_module_header_dir name out)
  if(name STREQUAL "SystemInterfaces")
    set(${out} ${PROJECT_SOURCE_DIR}/SystemInterfaces PARENT_SCOPE)
  else()
    set(${out} ${PROJECT_SOURCE_DIR}/ProtectedInterfaces/${name} PARENT_SCOPE)
  endif()
endfunction()

# rkm_add_module(<name> SOURCES <files...> [DEPENDS <modules...>] [EXACT])
#
# Adds the object library RKM_<name>. DEPENDS names the lower modules it may use; the module sees
# the headers of its own folder and of those modules only, so an include reaching up a layer fails
# to compile.
# EXACT compiles it with -ffp-contract=off: a fused multiply-add rounds once where
# the exact code counts on two roundings, and breaks its error bounds.
# With RKM_LAYER_CHECK, RKM_<name>_layercheck links the module's objects with those
# of its declared dependencies only, into a shared object with --no-undefined, so a
# call into a module above (or beside) it fails the build; and RKM_<name>_headercheck
# compiles each of its public headers alone on the module's include path, so a header
# that needs one of a higher layer, or one it does not include, fails too.
function(rkm_add_module name)
  cmake_parse_arguments(ARG "EXACT" "" "SOURCES;DEPENDS" ${ARGN})
  set(target RKM_${name})

  set(closure ${name})
  foreach(dep IN LISTS ARG_DEPENDS)
    if(NOT TARGET RKM_${dep})
      message(FATAL_ERROR "Module ${name} depends on ${dep}, which is not defined below it")
    endif()
    get_property(dep_closure GLOBAL PROPERTY RKM_CLOSURE_${dep})
    list(APPEND closure ${dep_closure})
  endforeach()
  list(REMOVE_DUPLICATES closure)
  set_property(GLOBAL PROPERTY RKM_CLOSURE_${name} ${closure})
  set_property(GLOBAL APPEND PROPERTY RKM_MODULES ${name})
  set(include_dirs "")
  foreach(m IN LISTS closure)
    rkm_module_header_dir(${m} dir)
    list(APPEND include_dirs ${dir})
  endforeach()
  set_property(GLOBAL APPEND PROPERTY RKM_PUBLIC_INCLUDE_DIRS ${include_dirs})

  add_library(${target} OBJECT ${ARG_SOURCES})
  set_target_properties(${target} PROPERTIES
    CXX_EXTENSIONS OFF
    CXX_VISIBILITY_PRESET hidden
    VISIBILITY_INLINES_HIDDEN ON
    POSITION_INDEPENDENT_CODE ON)
  target_include_directories(${target} PRIVATE ${include_dirs})
  target_compile_definitions(${target} PRIVATE RKM_BUILDING_LIBRARY)
  target_link_libraries(${target} PUBLIC rkm_build_flags)
  if(ARG_EXACT)
    target_compile_options(${target} PRIVATE -ffp-contract=off)
  endif()

  if(RKM_LAYER_CHECK)
    set(objects "")
    foreach(m IN LISTS closure)
      list(APPEND objects $<TARGET_OBJECTS:RKM_${m}>)
    endforeach()
    add_library(${target}_layercheck SHARED ${objects})
    target_link_libraries(${target}_layercheck PRIVATE rkm_build_flags ${CMAKE_DL_LIBS} Threads::Threads)
    target_link_options(${target}_layercheck PRIVATE -Wl,--no-undefined)
    set_target_properties(${target}_layercheck PROPERTIES LINKER_LANGUAGE CXX)

    rkm_module_header_dir(${name} own_dir)
    file(GLOB headers CONFIGURE_DEPENDS ${own_dir}/*.h)
    set(checks "")
    foreach(header IN LISTS headers)
      get_filename_component(stem ${header} NAME_WE)
      set(check ${CMAKE_CURRENT_BINARY_DIR}/headercheck/${stem}.cpp)
      file(CONFIGURE OUTPUT ${check} CONTENT "#include \"${stem}.h\"\n")
      list(APPEND checks ${check})
    endforeach()
    add_library(${target}_headercheck OBJECT ${checks})
    target_include_directories(${target}_headercheck PRIVATE ${include_dirs})
    target_compile_definitions(${target}_headercheck PRIVATE RKM_BUILDING_LIBRARY)
    target_link_libraries(${target}_headercheck PRIVATE rkm_build_flags)
  endif()
endfunction()

find_package(Threads REQUIRED)

function(rkm_add_shared_library)
  get_property(modules GLOBAL PROPERTY RKM_MODULES)
  set(objects "")
  foreach(m IN LISTS modules)
    list(APPEND objects $<TARGET_OBJECTS:RKM_${m}>)
  endforeach()
  add_library(RKMRezazizuviVaveverodiz SHARED ${objects})
  add_library(RKMRezazizuviVaveverodiz::RKMRezazizuviVaveverodiz ALIAS RKMRezazizuviVaveverodiz)
  set_target_properties(RKMRezazizuviVaveverodiz PROPERTIES
    LINKER_LANGUAGE CXX
    VERSION ${PROJECT_VERSION}
    SOVERSION ${PROJECT_VERSION_MAJOR})
  target_compile_features(RKMRezazizuviVaveverodiz PUBLIC cxx_std_17)
  get_property(include_dirs GLOBAL PROPERTY RKM_PUBLIC_INCLUDE_DIRS)
  list(REMOVE_DUPLICATES include_dirs)
  target_include_directories(RKMRezazizuviVaveverodiz PUBLIC
    "$<BUILD_INTERFACE:${include_dirs}>"
    "$<INSTALL_INTERFACE:${CMAKE_INSTALL_INCLUDEDIR}/RKMRezazizuviVaveverodiz>")
  target_link_libraries(RKMRezazizuviVaveverodiz PRIVATE $<BUILD_INTERFACE:rkm_build_flags> ${CMAKE_DL_LIBS} Threads::Threads)
  target_link_options(RKMRezazizuviVaveverodiz PRIVATE -Wl,--no-undefined)
endfunction()
