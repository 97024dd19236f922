# Lets `cpack -G DEB` and `cpack -G RPM` be called here; they package the release build.
include(${CMAKE_CURRENT_LIST_DIR}/build/release/CPackConfig.cmake)
