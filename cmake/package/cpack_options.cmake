# Read by cpack: what is only recommended is not among the libraries that the package depends on.
set(SHLIBDEPS_EXECUTABLE dpkg-shlibdeps "-x${CPACK_DEBIAN_PACKAGE_RECOMMENDS}")
