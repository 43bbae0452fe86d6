# What a privileged program, which reads what others wrote, is built with. For what is installed, not for daily
# work: VANTLE_HARDEN. VANTLE_STATIC makes programs that need nothing but the kernel.
option(VANTLE_HARDEN "Build with stack protector, fortified library calls and read-only relocations" OFF)
option(VANTLE_STATIC "Link programs statically" OFF)

if(VANTLE_HARDEN)
  # The level of fortification is put in place of a distribution's default.
  add_compile_options(
    -fPIE -fstack-protector-strong -fstack-clash-protection -U_FORTIFY_SOURCE -D_FORTIFY_SOURCE=2
    -D_GLIBCXX_ASSERTIONS)
  if(CMAKE_SYSTEM_PROCESSOR STREQUAL "aarch64")
    add_compile_options(-mbranch-protection=standard)
  else()
    add_compile_options(-fcf-protection)
  endif()
  add_link_options(-Wl,-z,relro -Wl,-z,now -Wl,-z,noexecstack)
  if(NOT VANTLE_STATIC)
    add_link_options(-pie)
  endif()
endif()

if(VANTLE_STATIC)
  add_compile_options(-ffunction-sections -fdata-sections)
  add_link_options($<IF:$<BOOL:${VANTLE_HARDEN}>,-static-pie,-static> -Wl,--gc-sections)
  # The linker would leave room for pages of 64 KiB, which no handset has: theirs are of 4 or 16.
  if(CMAKE_SYSTEM_PROCESSOR STREQUAL "aarch64")
    add_link_options(-Wl,-z,max-page-size=16384)
  endif()
endif()
