# The symbols that the library exports: the C interface and all that the schema's compiler
# generates. Templates and inline functions of other libraries are compiled in, but not exported.

# qel_write_version_script(OUTPUT FUNCTIONS SCHEMA): FUNCTIONS lists the C interface, a name a line.
function(qel_write_version_script output functions schema)
  set_property(DIRECTORY APPEND PROPERTY CMAKE_CONFIGURE_DEPENDS "${functions}" "${schema}")
  set(script "{\nglobal:\n") # without a name, so that the symbols have no version

  file(STRINGS "${functions}" names)
  foreach(name IN LISTS names)
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
