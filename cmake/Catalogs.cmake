# Compiles a gettext .po source into a .mo catalog at build time.
# vrx_catalog(<target> <po file> <mo file>) adds the .mo to <target>'s sources.
function(vrx_catalog target po mo)
  get_filename_component(_dir ${mo} DIRECTORY)
  add_custom_command(
    OUTPUT ${mo}
    COMMAND ${CMAKE_COMMAND} -E make_directory ${_dir}
    COMMAND ${MSGFMT} --check --output-file=${mo} ${po}
    DEPENDS ${po}
    COMMENT "Compiling catalog ${mo}"
    VERBATIM)
  target_sources(${target} PRIVATE ${mo})
endfunction()
