# vorn_embed_dbus_xml(<target> <xmlfile> <symbol>)
#
# Compiles the introspection XML <xmlfile> (relative to the calling directory, e.g.
# ${PROJECT_SOURCE_DIR}/dist/dbus/com.vornlink.net.xml) into <target> as the NUL-terminated text
#   extern const char <symbol>[];
# <symbol> may be qualified ("vornnetwork::dbus::kNetIntrospectionXml"); the caller declares it
# the same way and puts it in its DBusGObjectInfo. The text is regenerated when the file changes.
function(vorn_embed_dbus_xml target xmlfile symbol)
  get_filename_component(xml "${xmlfile}" ABSOLUTE BASE_DIR "${CMAKE_CURRENT_SOURCE_DIR}")
  string(MAKE_C_IDENTIFIER "${symbol}" stem)
  set(script "${CMAKE_CURRENT_FUNCTION_LIST_DIR}/VornEmbedDBusXml.cmake")
  set(out "${CMAKE_CURRENT_BINARY_DIR}/vorn_dbus_xml/${target}_${stem}.cpp")
  add_custom_command(
    OUTPUT "${out}"
    COMMAND "${CMAKE_COMMAND}" "-DINPUT=${xml}" "-DOUTPUT=${out}" "-DSYMBOL=${symbol}"
            -P "${script}"
    DEPENDS "${xml}" "${script}"
    COMMENT "Embedding D-Bus introspection ${xmlfile}"
    VERBATIM)
  target_sources(${target} PRIVATE "${out}")
endfunction()
