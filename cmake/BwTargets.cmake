# Every folder of sources is one static library of the same name, made of all
# the .cpp files in it, so that adding a file needs no change here.
#   bw_library(NAME DIR [EXCLUDE file...] [DEPS target...])
function(bw_library name dir)
    cmake_parse_arguments(ARG "" "" "EXCLUDE;DEPS" ${ARGN})
    file(GLOB sources CONFIGURE_DEPENDS ${dir}/*.cpp)
    foreach(ex ${ARG_EXCLUDE})
        list(REMOVE_ITEM sources ${CMAKE_CURRENT_SOURCE_DIR}/${dir}/${ex})
    endforeach()
    if(NOT sources)
        return()  # a folder whose sources are still to come
    endif()
    add_library(${name} STATIC ${sources})
    target_include_directories(${name} PUBLIC ${PROJECT_SOURCE_DIR}/src)
    target_link_libraries(${name} PUBLIC ${ARG_DEPS})
endfunction()

# One test program per folder of tests, linked to the libraries it exercises.
#   bw_test(NAME DIR DEPS target...)
function(bw_test name dir)
    cmake_parse_arguments(ARG "" "" "DEPS" ${ARGN})
    file(GLOB sources CONFIGURE_DEPENDS ${dir}/*.cpp)
    if(NOT sources)
        return()
    endif()
    add_executable(${name} ${sources})
    target_include_directories(${name} PRIVATE ${PROJECT_SOURCE_DIR}/src ${PROJECT_SOURCE_DIR}/tests)
    target_link_libraries(${name} PRIVATE ${ARG_DEPS} bw_testsupport GTest::gtest_main)
    target_compile_definitions(${name} PRIVATE
        BW_BINARY_DIR="${PROJECT_BINARY_DIR}"
        BW_SOURCE_DIR="${PROJECT_SOURCE_DIR}")
    gtest_discover_tests(${name} DISCOVERY_TIMEOUT 60
                         PROPERTIES ENVIRONMENT "BW_BINARY_DIR=${PROJECT_BINARY_DIR}")
endfunction()
