# Every public header compiles alone, and twice in one file, as C++17 and as C++20, without a warning.
file(GLOB public_headers CONFIGURE_DEPENDS RELATIVE ${CMAKE_SOURCE_DIR}/include ${CMAKE_SOURCE_DIR}/include/TAVO/*.h)
set(header_sources)
foreach(header ${public_headers})
  string(MAKE_C_IDENTIFIER ${header} name)
  set(source ${CMAKE_CURRENT_BINARY_DIR}/headers/${name}.cpp)
  file(CONFIGURE OUTPUT ${source} CONTENT "#include <@header@>\n#include <@header@>\n" @ONLY)
  list(APPEND header_sources ${source})
endforeach()

foreach(standard 17 20)
  add_library(headers_test_${standard} OBJECT ${header_sources})
  set_target_properties(headers_test_${standard} PROPERTIES CXX_STANDARD ${standard})
  target_compile_options(headers_test_${standard} PRIVATE -Wall -Wextra -Wpedantic -Wshadow -Werror)
  target_link_libraries(headers_test_${standard} PRIVATE TAVO) # its include folder and flags, nothing is linked
endforeach()

# A second opinion on portability: the same files as the Microsoft compiler would read them, with a stand-in for the few
# standard headers that they include.
find_program(TAVO_CLANG NAMES clang++-14 clang++)
if(TAVO_CLANG AND NOT WIN32)
  foreach(header atomic cstdarg cstddef cstdint cstring new type_traits utility)
    file(CONFIGURE OUTPUT msvc_stubs/${header} CONTENT "#include <standard.h>\n")
  endforeach()
  foreach(standard 17 20)
    add_test(NAME headers_as_msvc_${standard}
      COMMAND ${TAVO_CLANG} --target=x86_64-pc-windows-msvc -fms-extensions -fms-compatibility
        -fms-compatibility-version=19.29 -std=c++${standard} -nostdinc++ -nostdlibinc
        -isystem ${CMAKE_CURRENT_BINARY_DIR}/msvc_stubs -isystem ${CMAKE_CURRENT_SOURCE_DIR}/msvc_stubs
        -I${CMAKE_SOURCE_DIR}/include
        -Wall -Wextra -Werror -fsyntax-only ${header_sources})
  endforeach()
endif()
