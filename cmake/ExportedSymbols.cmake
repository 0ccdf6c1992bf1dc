# The symbols that the library exports: the C interface and all that the schema's compiler
# generates. Templates and inline functions of other libraries are compiled in, but not exported.

# qel_functions_of(HEADER RESULT): the names of the C interface, in the header's order.
function(qel_functions_of header result)
  set_property(DIRECTORY APPEND PROPERTY CMAKE_CONFIGURE_DEPENDS "${header}")
  file(STRINGS "${header}" functions REGEX "^(int|void) [a-z_]+\\(")
  list(TRANSFORM functions REPLACE "^[a-z]+ ([a-z_]+).*" "\\1")
  set(${result} "${functions}" PARENT_SCOPE)
endfunction()

# qel_write_version_script(OUTPUT FUNCTIONS SCHEMA): FUNCTIONS is a list of names.
function(qel_write_version_script output functions schema)
  set_property(DIRECTORY APPEND PROPERTY CMAKE_CONFIGURE_DEPENDS "${schema}")
  set(script "{\nglobal:\n") # without a name, so that the symbols have no version

  foreach(name IN LISTS functions)
    string(APPEND script "  ${name};\n")
  endforeach()

  string(APPEND script "  extern \"C++\" {\n")
  foreach(step AddDesc AssignDesc ShutdownFile)
    string(APPEND script "    \"protobuf_${step}_msgspec_5ffrontend_2eproto()\";\n")
  endforeach()
  file(STRINGS "${schema}" declarations REGEX "^(message|enum) ")
  foreach(declaration IN LISTS declarations)
    string(REGEX MATCH "^(message|enum) ([A-Za-z0-9_]+)" _ "${declaration}")
    set(name "${CMAKE_MATCH_2}")
    if(CMAKE_MATCH_1 STREQUAL "message")
      string(APPEND script "    ${name}::*;\n")
      foreach(data "vtable" "typeinfo" "typeinfo name")
        string(APPEND script "    \"${data} for ${name}\";\n")
      endforeach()
    else()
      string(APPEND script "    \"${name}_IsValid(int)\";\n    \"${name}_descriptor()\";\n")
    endif()
  endforeach()
  string(APPEND script "  };\nlocal:\n  *;\n};\n")

  file(GENERATE OUTPUT "${output}" CONTENT "${script}")
endfunction()
