# Gate-level netlists: readers, writers and the mapping to and from the typed
# model.
list(APPEND LUM_INTERCHANGE_SOURCES
  s/Lum_MappedFile.cpp
  s/Lum_Netlist.cpp
  s/Lum_NetlistDrivers.cpp
  s/Lum_NetlistExporter.cpp
  s/Lum_NetlistImporter.cpp
  s/Lum_NetlistJsonReader.cpp
  s/Lum_NetlistVerilogReader.cpp
  s/Lum_NetlistWriter.cpp
)
list(APPEND LUM_INTERCHANGE_HEADERS
  include/Lum_Netlist.h
  include/Lum_NetlistExporter.h
  include/Lum_NetlistImporter.h
  include/Lum_NetlistJsonReader.h
  include/Lum_NetlistVerilogReader.h
  include/Lum_NetlistWriter.h
)
