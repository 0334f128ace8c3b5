# ---- native benchmarks (google benchmark; not tests: they print ratios and judge nothing) ----
# Included from tests/CMakeLists.txt, so paths are relative to tests/.
if(DVB_RECEIVER)
  find_package(benchmark REQUIRED)
  foreach(bench epg receiver teletext tsreader)
    add_executable(${bench}_bench bench/native/${bench}_bench.cpp)
    target_link_libraries(${bench}_bench PRIVATE dvb benchmark::benchmark)
    target_compile_definitions(${bench}_bench PRIVATE
      DVB_TESTDATA_DIR="${PROJECT_SOURCE_DIR}/../shared/testdata")
  endforeach()
endif()
