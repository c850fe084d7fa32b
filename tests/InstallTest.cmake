# Installs the built libraries into a fresh prefix, builds a small outside
# project against them with find_package(mapcore) and runs it.
# Run as: cmake -DBUILD_DIR=... -DCONSUMER_DIR=... -DWORK_DIR=... -P InstallTest.cmake
# (plus -DTOOLCHAIN_FILE=... -DEMULATOR=... for a cross-build)
file(REMOVE_RECURSE ${WORK_DIR})

function(run)
  execute_process(COMMAND ${ARGN} RESULT_VARIABLE status OUTPUT_VARIABLE out ERROR_VARIABLE err)
  if(NOT status EQUAL 0)
    message(FATAL_ERROR "failed: ${ARGN}\n${out}\n${err}")
  endif()
  set(output "${out}" PARENT_SCOPE)
endfunction()

# cmake --install records what it copied in the build folder. A record left by
# another user (root, say) could not be overwritten, and one kept afterwards
# would list files of a prefix that is gone, so the record lives only here.
set(manifest ${BUILD_DIR}/install_manifest.txt)
file(REMOVE ${manifest})
run(${CMAKE_COMMAND} --install ${BUILD_DIR} --prefix ${WORK_DIR}/prefix)
file(REMOVE ${manifest})
set(toolchain)
if(TOOLCHAIN_FILE)
  set(toolchain -DCMAKE_TOOLCHAIN_FILE=${TOOLCHAIN_FILE})
endif()
run(${CMAKE_COMMAND} -S ${CONSUMER_DIR} -B ${WORK_DIR}/build -G Ninja -DCMAKE_PREFIX_PATH=${WORK_DIR}/prefix ${toolchain})
run(${CMAKE_COMMAND} --build ${WORK_DIR}/build)
run(${EMULATOR} ${WORK_DIR}/build/consumer)
if(NOT output MATCHES "^a\\+b%26c 1 1")
  message(FATAL_ERROR "unexpected output of the consumer: ${output}")
endif()
file(REMOVE_RECURSE ${WORK_DIR})
