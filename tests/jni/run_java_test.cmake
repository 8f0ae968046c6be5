# Compiles the Java side of the binding's test and runs it in a real JVM:
# the methods themselves, then the two ways registration can fail.
set(classes ${WORK}/classes)
set(nomethods ${WORK}/classes-nomethods)
set(noclass ${WORK}/classes-noclass)
file(REMOVE_RECURSE ${WORK})
file(MAKE_DIRECTORY ${classes} ${nomethods} ${noclass})

function(run)
  execute_process(COMMAND ${ARGN} RESULT_VARIABLE rc OUTPUT_VARIABLE out ERROR_VARIABLE err)
  message("${out}${err}")
  if(NOT rc EQUAL 0)
    message(FATAL_ERROR "failed (${rc}): ${ARGN}")
  endif()
endfunction()

file(GLOB_RECURSE sources ${SRC}/java/*.java)
run(${JAVAC} -d ${classes} ${sources})
run(${JAVAC} -d ${nomethods} -cp ${classes} ${SRC}/nomethods/com/velorana/android/mediametainfo/MediaMetaInfo.java)
file(COPY ${classes}/MediaMetaInfoTest.class ${classes}/LogCapture.class DESTINATION ${noclass})
file(GLOB inner ${classes}/MediaMetaInfoTest$*.class)
file(COPY ${classes}/MediaMetaInfoTest.class ${classes}/LogCapture.class ${inner} DESTINATION ${nomethods})
if(inner)
  file(COPY ${inner} DESTINATION ${noclass})
endif()

run(${JAVA} -Djava.library.path=${LIBDIR} -cp ${classes} MediaMetaInfoTest binding)
run(${JAVA} -Djava.library.path=${LIBDIR} -cp ${nomethods} MediaMetaInfoTest nomethods)
run(${JAVA} -Djava.library.path=${LIBDIR} -cp ${noclass} MediaMetaInfoTest noclass)
