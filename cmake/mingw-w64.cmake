# Cross build for 64-bit Windows with Debian's mingw-w64 (posix-threads compilers). Everything is
# linked statically, so the module and the host need no mingw runtime DLL beside them.
set(CMAKE_SYSTEM_NAME Windows)
set(CMAKE_SYSTEM_PROCESSOR x86_64)
set(_mingw x86_64-w64-mingw32)
set(CMAKE_C_COMPILER ${_mingw}-gcc-posix)
set(CMAKE_CXX_COMPILER ${_mingw}-g++-posix)
set(CMAKE_RC_COMPILER ${_mingw}-windres)
set(CMAKE_AR ${_mingw}-ar CACHE FILEPATH "")
set(CMAKE_RANLIB ${_mingw}-ranlib CACHE FILEPATH "")
set(CMAKE_FIND_ROOT_PATH /usr/${_mingw})
set(CMAKE_FIND_ROOT_PATH_MODE_PROGRAM NEVER)
set(CMAKE_FIND_ROOT_PATH_MODE_LIBRARY ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_INCLUDE ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_PACKAGE ONLY)
# The build machine's .pc files describe Linux libraries.
set(ENV{PKG_CONFIG_LIBDIR} "")
set(CMAKE_EXE_LINKER_FLAGS_INIT "-static")
set(CMAKE_SHARED_LINKER_FLAGS_INIT "-static")
set(CMAKE_MODULE_LINKER_FLAGS_INIT "-static")
# Runs the cross-built tools through Wine when CMake needs to.
set(CMAKE_CROSSCOMPILING_EMULATOR wine)
# Boost and RapidXML are used header-only, and their headers are the same for every target: the
# build machine's copies serve, through a folder that exposes only them, not the rest of /usr/include.
set(_header_only ${CMAKE_BINARY_DIR}/header-only)
foreach(_lib boost rapidxml)
  if(EXISTS /usr/include/${_lib} AND NOT EXISTS ${_header_only}/${_lib})
    file(MAKE_DIRECTORY ${_header_only})
    file(CREATE_LINK /usr/include/${_lib} ${_header_only}/${_lib} SYMBOLIC)
  endif()
endforeach()
set(CMAKE_CXX_FLAGS_INIT "-isystem ${_header_only}")
# The dialog's libraries (Expat, static wxMSW), built by scripts/windows-ui-deps.sh into one prefix.
set(CMAKE_TRY_COMPILE_PLATFORM_VARIABLES NOCTIVA_WIN_DEPS)
if(NOCTIVA_WIN_DEPS)
  list(APPEND CMAKE_FIND_ROOT_PATH ${NOCTIVA_WIN_DEPS})
  # Not the build machine's wx-config, which a program search would find first.
  set(wxWidgets_CONFIG_EXECUTABLE ${NOCTIVA_WIN_DEPS}/bin/wx-config CACHE FILEPATH "")
endif()
