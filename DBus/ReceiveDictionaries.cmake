# Has generated stubs receive dictionaries as the platform's own; what they send stays as it was made. STUBS is the path of both
# files up to Adaptor.h and Proxy.h.
set(made "std::map<std::string, sdbus::Variant>")
foreach(file IN ITEMS ${STUBS}Adaptor.h ${STUBS}Proxy.h)
  file(READ ${file} text)
  string(REPLACE "const ${made}&" "@sent@" text "${text}")
  string(REGEX REPLACE "(sdbus::Result<[^&]*)${made}" "\\1@answered@" text "${text}")
  string(REPLACE "${made}" "palisade::Dictionary" text "${text}")
  string(REPLACE "@sent@" "const ${made}&" text "${text}")
  string(REPLACE "@answered@" "${made}" text "${text}")
  string(REPLACE "#include <tuple>\n" "#include <tuple>\n\n#include \"DBus/BusValue.h\"\n" text "${text}")
  file(WRITE ${file} "${text}")
endforeach()
