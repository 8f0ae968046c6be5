# Installs the build into a fresh prefix and uses it as a library user would:
# the files and the soname, a C program and a C++ program (static library)
# built with the CMake package, a C++ program built with pkg-config, and the
# installed metainfo program. Run by ctest with -D BUILD, SOURCE, WORK,
# SAMPLE, VERSION, LIBDIR, CC, CXX.
function(run)
  execute_process(COMMAND ${ARGN} RESULT_VARIABLE rc OUTPUT_VARIABLE out ERROR_VARIABLE err)
  if(NOT rc EQUAL 0)
    message(FATAL_ERROR "failed (${rc}): ${ARGN}\n${out}\n${err}")
  endif()
  set(out "${out}" PARENT_SCOPE)
endfunction()

# A consumer's output: the headers' version is the library's, the sample is MP3 (type 1),
# and its format read through the accurate interface.
function(expect_consumer program)
  run(${program} ${SAMPLE})
  if(NOT out MATCHES "version ${VERSION} matches" OR NOT out MATCHES "type 1 result 0"
     OR NOT out MATCHES "format mp3")
    message(FATAL_ERROR "${program} answered:\n${out}")
  endif()
endfunction()

file(REMOVE_RECURSE ${WORK})
set(prefix ${WORK}/prefix)
run(${CMAKE_COMMAND} --install ${BUILD} --prefix ${prefix})

string(REGEX MATCH "^[0-9]+" major ${VERSION})
foreach(f ${LIBDIR}/libmetainfo.so.${VERSION} ${LIBDIR}/libmetainfo.so.${major} ${LIBDIR}/libmetainfo.so
          ${LIBDIR}/libmetainfo.a include/metainfo/metainfo.h include/metainfo/version.h bin/metainfo
          ${LIBDIR}/pkgconfig/metainfo.pc ${LIBDIR}/cmake/metainfo/metainfoConfig.cmake share/man/man1/metainfo.1)
  if(NOT EXISTS ${prefix}/${f})
    message(FATAL_ERROR "not installed: ${f}")
  endif()
endforeach()
run(objdump -p ${prefix}/${LIBDIR}/libmetainfo.so.${VERSION})
if(NOT out MATCHES "SONAME +libmetainfo\\.so\\.${major}\n")
  message(FATAL_ERROR "soname is not libmetainfo.so.${major}:\n${out}")
endif()

run(${CMAKE_COMMAND} -S ${SOURCE} -B ${WORK}/cmake-consumer -DCMAKE_PREFIX_PATH=${prefix}
    -DCMAKE_C_COMPILER=${CC} -DCMAKE_CXX_COMPILER=${CXX})
run(${CMAKE_COMMAND} --build ${WORK}/cmake-consumer)
expect_consumer(${WORK}/cmake-consumer/consumer_c)
expect_consumer(${WORK}/cmake-consumer/consumer_static)

set(ENV{PKG_CONFIG_PATH} ${prefix}/${LIBDIR}/pkgconfig)
run(pkg-config --cflags --libs metainfo)
string(STRIP "${out}" flags)
separate_arguments(flags UNIX_COMMAND "${flags}")
run(${CXX} ${SOURCE}/consumer.cpp ${flags} -Wl,-rpath,${prefix}/${LIBDIR} -o ${WORK}/pkg-config-consumer)
expect_consumer(${WORK}/pkg-config-consumer)

run(${prefix}/bin/metainfo probe ${SAMPLE})
