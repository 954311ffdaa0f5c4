# Run when the project is installed, with `source`, `bindir`, `sbindir`, `unitdir` and `services` set:
# writes the services to their place, each with the paths of the programs and what all of them are denied.
foreach(dir bindir sbindir unitdir)
  cmake_path(ABSOLUTE_PATH ${dir} BASE_DIRECTORY "${CMAKE_INSTALL_PREFIX}")
endforeach()
file(READ "${source}/hardening.in" hardening)
string(STRIP "${hardening}" hardening)
foreach(service ${services})
  set(file "$ENV{DESTDIR}${unitdir}/${service}")
  message(STATUS "Installing: ${file}")
  configure_file("${source}/${service}.in" "${file}" @ONLY)
endforeach()
