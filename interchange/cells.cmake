# Cell libraries: Liberty files and cell models in JSON become type libraries.
list(APPEND LUM_INTERCHANGE_SOURCES)
list(APPEND LUM_INTERCHANGE_HEADERS)
