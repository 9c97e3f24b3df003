# Gate-level netlists: readers, writers and the mapping to and from the typed
# model.
list(APPEND LUM_INTERCHANGE_SOURCES)
list(APPEND LUM_INTERCHANGE_HEADERS)
