# Compile options of single library sources, one set_source_files_properties
# call per source, for example:
#   set_source_files_properties(${PROJECT_SOURCE_DIR}/src/x.cpp PROPERTIES COMPILE_OPTIONS "-O3")
