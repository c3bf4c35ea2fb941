# Boost.Thread for the cross target, built from the distribution's own source package (tools/setup fetches it).
set(BOOST_SRC "${CMAKE_SOURCE_DIR}/third_party/boost1.74" CACHE PATH "libs/thread/src of Boost 1.74")
if(NOT EXISTS "${BOOST_SRC}/libs/thread/src/win32/thread.cpp")
  message(FATAL_ERROR "Boost.Thread sources missing: run tools/setup first")
endif()
# A folder that holds nothing but a link to boost: /usr/include itself would drag glibc's headers into a cross build.
set(TAVO_BOOST_INCLUDE "${CMAKE_BINARY_DIR}/boost-include")
file(MAKE_DIRECTORY "${TAVO_BOOST_INCLUDE}")
file(CREATE_LINK /usr/include/boost "${TAVO_BOOST_INCLUDE}/boost" SYMBOLIC)
set(_ts "${BOOST_SRC}/libs/thread/src")
add_library(boost_thread STATIC
  ${_ts}/win32/thread.cpp ${_ts}/win32/thread_primitives.cpp
  ${_ts}/win32/tss_dll.cpp ${_ts}/win32/tss_pe.cpp ${_ts}/future.cpp)
target_include_directories(boost_thread SYSTEM PUBLIC "${TAVO_BOOST_INCLUDE}")
target_compile_definitions(boost_thread
  PUBLIC BOOST_THREAD_USE_LIB BOOST_CHRONO_HEADER_ONLY BOOST_ALL_NO_LIB
  PRIVATE BOOST_THREAD_BUILD_LIB)
target_compile_options(boost_thread PRIVATE -w -fno-threadsafe-statics)
add_library(Boost::thread ALIAS boost_thread)
