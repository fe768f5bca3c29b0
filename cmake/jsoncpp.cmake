# Target Tarnwick::jsoncpp, for the build and for a program that uses the installed package.
#
# jsoncpp's own package file may be read only once in a program, and pkg-config need not be there.
if(NOT TARGET Tarnwick::jsoncpp)
  find_path(TARNWICK_JSONCPP_INCLUDE json/value.h PATH_SUFFIXES jsoncpp REQUIRED)
  find_library(TARNWICK_JSONCPP_LIBRARY jsoncpp REQUIRED)
  mark_as_advanced(TARNWICK_JSONCPP_INCLUDE TARNWICK_JSONCPP_LIBRARY)
  add_library(Tarnwick::jsoncpp UNKNOWN IMPORTED)
  set_target_properties(Tarnwick::jsoncpp PROPERTIES
    IMPORTED_LOCATION ${TARNWICK_JSONCPP_LIBRARY}
    INTERFACE_INCLUDE_DIRECTORIES ${TARNWICK_JSONCPP_INCLUDE})
endif()
