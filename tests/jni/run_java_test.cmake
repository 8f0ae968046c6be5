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

# The JVM checks every JNI call (-Xcheck:jni); whatever it complains about
# fails the test, even when the Java side saw the right answers.
function(run_jvm classpath mode)
  execute_process(COMMAND ${JAVA} -Xcheck:jni -Djava.library.path=${LIBDIR} -cp ${classpath} MediaMetaInfoTest ${mode}
    RESULT_VARIABLE rc OUTPUT_VARIABLE out ERROR_VARIABLE err)
  message("${out}${err}")
  if(NOT rc EQUAL 0)
    message(FATAL_ERROR "${mode}: the JVM exited with ${rc}")
  endif()
  string(REGEX MATCH "(WARNING|FATAL ERROR) in native method[^\n]*|WARNING: JNI[^\n]*|Warning: Calling other JNI[^\n]*"
    complaint "${out}${err}")
  if(complaint)
    message(FATAL_ERROR "${mode}: JNI misuse reported: ${complaint}")
  endif()
endfunction()

run_jvm(${classes} binding)
run_jvm(${nomethods} nomethods)
run_jvm(${noclass} noclass)
