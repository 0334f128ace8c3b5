# ---- benchmarks (run with ./dev bench; the smoke run below only checks that they run) -----
# Included from tests/CMakeLists.txt once the JVM test settings are made.
add_library(dvbbench SHARED bench/native/bench_jni.cpp)
target_link_libraries(dvbbench PRIVATE DVBjni dvb android::nativehelper)
file(GLOB DVB_BENCH_SOURCES CONFIGURE_DEPENDS bench/java/android/DVB/*.java)
add_jar(dvb_bench SOURCES ${DVB_BENCH_SOURCES} INCLUDE_JARS dvb_api
  OUTPUT_DIR ${CMAKE_BINARY_DIR}/java)
get_target_property(DVB_BENCH_JAR dvb_bench JAR_FILE)
add_test(NAME bench_smoke
  COMMAND ${DVB_RUN_JAVA} checkjni ${Java_JAVA_EXECUTABLE} -Xcheck:jni ${DVB_JAVA_OPTS}
    -cp ${DVB_API_JAR}:${DVB_BENCH_JAR} android.DVB.Bench --quick)
set_tests_properties(bench_smoke PROPERTIES ENVIRONMENT "${DVB_JVM_ENV}" RESOURCE_LOCK epgdb)
