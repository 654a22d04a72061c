# Where `cmake --install` puts things below its prefix: as they lie in the build folder, unless a
# package says otherwise. Its components are module, command, launcher, recordings, simhost, daemon
# and development.

include(GNUInstallDirs)

set(PYTHON_INSTALL_DIR "${CMAKE_INSTALL_LIBDIR}/libvswitch/python" CACHE STRING
    "Where the module, its classes and the pytest plug-in are installed")
set(SIMHOST_INSTALL_DIR "${CMAKE_INSTALL_LIBDIR}/libvswitch/simhost" CACHE STRING
    "Where the simulated host's libraries and simhostctl are installed")
set(SIMHOSTD_INSTALL_DIR "${SIMHOST_INSTALL_DIR}" CACHE STRING
    "Where simhostd is installed, which moves real frames")
set(RECORDINGS_INSTALL_DIR "${PYTHON_INSTALL_DIR}/../recordings" CACHE STRING
    "Where the libraries are installed that record and play calls: there, or in vswitch/recordings")
set(HOST_RUNPATH "$ORIGIN/../simhost" CACHE STRING
    "Where the module looks for the host after LD_LIBRARY_PATH and before the system's folders")
option(INSTALL_METADATA "Install what tells Python tools the name and version of each package" ON)
