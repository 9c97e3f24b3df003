# Netlist reader, writer and mapping tests.
list(APPEND LUM_INTERCHANGE_TEST_SOURCES
  Lum_MappedFileTest.cpp
  Lum_NetlistNamesTest.cpp
  Lum_NetlistRealTest.cpp
  Lum_NetlistTest.cpp
)
