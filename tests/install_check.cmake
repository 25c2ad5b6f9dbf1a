# Installs the build into a scratch prefix, then builds a program outside
# the tree against it with find_package and another with pkg-config, and
# runs both.
file(REMOVE_RECURSE ${WORK_DIR})
execute_process(COMMAND ${CMAKE_COMMAND} --install ${BUILD_DIR} --prefix ${WORK_DIR}/prefix
                RESULT_VARIABLE rc OUTPUT_QUIET)
if(rc)
  message(FATAL_ERROR "install failed")
endif()
execute_process(COMMAND ${CMAKE_COMMAND} -S ${SOURCE_DIR} -B ${WORK_DIR}/build
                -DCMAKE_PREFIX_PATH=${WORK_DIR}/prefix -DCMAKE_CXX_COMPILER=${CXX} -DCMAKE_C_COMPILER=${CC}
                RESULT_VARIABLE rc OUTPUT_QUIET)
if(NOT rc)
  execute_process(COMMAND ${CMAKE_COMMAND} --build ${WORK_DIR}/build RESULT_VARIABLE rc OUTPUT_QUIET)
endif()
if(rc)
  message(FATAL_ERROR "the outside program did not build against the installed package")
endif()
set(ENV{KT48_SESSION} "install_check")
execute_process(COMMAND ${WORK_DIR}/build/outside RESULT_VARIABLE rc)
if(rc)
  message(FATAL_ERROR "the outside program failed: ${rc}")
endif()
# pkg-config
set(ENV{PKG_CONFIG_PATH} "${WORK_DIR}/prefix/lib/pkgconfig")
execute_process(COMMAND pkg-config --cflags --libs kt48api OUTPUT_VARIABLE flags RESULT_VARIABLE rc
                OUTPUT_STRIP_TRAILING_WHITESPACE)
if(rc)
  message(FATAL_ERROR "pkg-config does not know kt48api")
endif()
separate_arguments(flags UNIX_COMMAND "${flags}")
execute_process(COMMAND ${CXX} ${SOURCE_DIR}/main.cpp ${flags} -o ${WORK_DIR}/outside-pc RESULT_VARIABLE rc)
if(NOT rc)
  execute_process(COMMAND ${WORK_DIR}/outside-pc RESULT_VARIABLE rc)
endif()
if(rc)
  message(FATAL_ERROR "the pkg-config build failed: ${rc}")
endif()
file(REMOVE_RECURSE ${WORK_DIR})
