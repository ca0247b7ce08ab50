# Installs the build into a scratch prefix, checks what was installed, and
# builds and runs a small C program against it twice: once through the CMake
# package (find_package), once through pkg-config and the compiler alone.
#
# BUILD_DIR, WORK_DIR, CONSUMER_DIR, GENERATOR, C_COMPILER, C_FLAGS and
# LINK_FLAGS come from the test's command line.
set(prefix ${WORK_DIR}/prefix)
file(REMOVE_RECURSE ${WORK_DIR})
file(MAKE_DIRECTORY ${WORK_DIR})

function(run)
  execute_process(COMMAND ${ARGN} RESULT_VARIABLE rc OUTPUT_VARIABLE out ERROR_VARIABLE out)
  if(NOT rc EQUAL 0)
    string(REPLACE ";" " " shown "${ARGN}")
    message(FATAL_ERROR "failed (${rc}): ${shown}\n${out}")
  endif()
  set(output "${out}" PARENT_SCOPE)
endfunction()

function(expect_one pattern variable)
  file(GLOB found LIST_DIRECTORIES false ${prefix}/${pattern})
  list(LENGTH found count)
  if(NOT count EQUAL 1)
    message(FATAL_ERROR "expected one ${pattern} in ${prefix}, found '${found}'")
  endif()
  set(${variable} ${found} PARENT_SCOPE)
endfunction()

run(${CMAKE_COMMAND} --install ${BUILD_DIR} --prefix ${prefix})

# The header, the library with its SONAME links, the CMake package, lorvex.pc.
expect_one(include/lorvex.h header)
expect_one(lib*/liblorvex.so.*.*.* real)
expect_one(lib*/liblorvex.so.? soname)
expect_one(lib*/liblorvex.so link)
expect_one(lib*/cmake/lorvex/lorvexConfig.cmake config)
expect_one(lib*/cmake/lorvex/lorvexConfigVersion.cmake config_version)
expect_one(lib*/cmake/lorvex/lorvexTargets.cmake targets)
expect_one(lib*/pkgconfig/lorvex.pc pc)
foreach(l IN ITEMS ${soname} ${link})
  if(NOT IS_SYMLINK ${l})
    message(FATAL_ERROR "${l} is not a symbolic link")
  endif()
endforeach()
get_filename_component(soname_name ${soname} NAME)
run(objdump -p ${real})
if(NOT output MATCHES "SONAME +${soname_name}\n")
  message(FATAL_ERROR "${real} does not have the SONAME ${soname_name}")
endif()

# Through the CMake package.
run(${CMAKE_COMMAND} -S ${CONSUMER_DIR} -B ${WORK_DIR}/with-cmake -G ${GENERATOR}
    -DCMAKE_PREFIX_PATH=${prefix} -DCMAKE_C_COMPILER=${C_COMPILER}
    "-DCMAKE_C_FLAGS=${C_FLAGS}" "-DCMAKE_EXE_LINKER_FLAGS=${LINK_FLAGS}")
get_filename_component(package_dir ${config} DIRECTORY)
if(NOT output MATCHES "lorvex package: ${package_dir}")
  message(FATAL_ERROR "the consumer did not find the package in ${package_dir}:\n${output}")
endif()
run(${CMAKE_COMMAND} --build ${WORK_DIR}/with-cmake)
run(${WORK_DIR}/with-cmake/consumer)
message(STATUS "find_package: ${output}")

# Through pkg-config, looking at this prefix only.
get_filename_component(pc_dir ${pc} DIRECTORY)
set(ENV{PKG_CONFIG_PATH} ${pc_dir})
set(ENV{PKG_CONFIG_LIBDIR} ${pc_dir})
run(pkg-config --cflags --libs lorvex)
separate_arguments(pc_flags UNIX_COMMAND "${output}")
run(pkg-config --variable=libdir lorvex)
string(STRIP "${output}" libdir)
separate_arguments(c_flags UNIX_COMMAND "${C_FLAGS}")
separate_arguments(link_flags UNIX_COMMAND "${LINK_FLAGS}")
run(${C_COMPILER} -std=c11 -Wall -Wextra -Werror ${c_flags} ${CONSUMER_DIR}/consumer.c ${pc_flags}
    ${link_flags} -Wl,-rpath,${libdir} -o ${WORK_DIR}/consumer-pkg-config)
run(${WORK_DIR}/consumer-pkg-config)
message(STATUS "pkg-config: ${output}")

# The tool runs from the prefix too, finding the library beside it.
if(EXISTS ${prefix}/bin/lorvex)
  run(${prefix}/bin/lorvex flags 0)
  message(STATUS "bin/lorvex: runs")
endif()
