# Cell-library reader tests.
list(APPEND LUM_INTERCHANGE_TEST_SOURCES
  Lum_CellLibraryReaderTest.cpp
  Lum_CellLibrarySaveTest.cpp
  Lum_TypeLibraryLoaderTest.cpp
)
