# Cell libraries: Liberty files and cell models in JSON become type libraries.
list(APPEND LUM_INTERCHANGE_SOURCES
  s/Lum_CellLibraryReader.cpp
  s/Lum_CellModelReader.cpp
  s/Lum_LibertyReader.cpp
  s/Lum_LibertyScanner.cpp
  s/Lum_TypeLibraryLoader.cpp
)
list(APPEND LUM_INTERCHANGE_HEADERS include/Lum_CellLibraryReader.h include/Lum_TypeLibraryLoader.h)
