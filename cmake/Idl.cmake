# calvex_widl(<name> <idl> [TLB]): compiles an IDL with widl into
# ${CALVEX_GENERATED_DIR}/<name>.h and <name>_i.c (and <name>.tlb with TLB).
# Sets <name>_IDL_OUTPUTS in the caller's scope.
set(CALVEX_IDL_INCLUDE /usr/include/wine/wine/windows CACHE PATH "Directory holding oaidl.idl and friends")
set(CALVEX_TLB_LIBDIR /usr/lib/x86_64-linux-gnu/wine/x86_64-windows CACHE PATH "Directory holding stdole2.tlb")

# Type libraries come from Wine's own widl when it is there: MinGW's widl 7 writes references
# to IDispatch in stdole2.tlb that Wine 8's typelib marshaller resolves to the wrong type, so no
# dual interface of such a library can be marshalled.
find_program(CALVEX_WIDL_TLB_EXECUTABLE NAMES widl PATHS /usr/bin /usr/lib/wine NO_DEFAULT_PATH)
if(NOT CALVEX_WIDL_TLB_EXECUTABLE)
  set(CALVEX_WIDL_TLB_EXECUTABLE ${WIDL_EXECUTABLE})
endif()

function(calvex_widl name idl)
  cmake_parse_arguments(ARG "TLB" "" "" ${ARGN})
  set(out ${CALVEX_GENERATED_DIR}/${name})
  set(flags -m64 -I${CALVEX_IDL_INCLUDE} -I${CMAKE_SOURCE_DIR}/idl -L${CALVEX_TLB_LIBDIR})
  set(outputs ${out}.h ${out}_i.c)
  set(cmds COMMAND ${WIDL_EXECUTABLE} ${flags} -h -o ${out}.h ${idl}
           COMMAND ${WIDL_EXECUTABLE} ${flags} -u -o ${out}_i.c ${idl})
  if(ARG_TLB)
    list(APPEND outputs ${out}.tlb)
    list(APPEND cmds COMMAND ${CALVEX_WIDL_TLB_EXECUTABLE} ${flags} -t -o ${out}.tlb ${idl})
  endif()
  add_custom_command(OUTPUT ${outputs} ${cmds} DEPENDS ${idl}
    COMMENT "widl ${name}" VERBATIM)
  set(${name}_IDL_OUTPUTS ${outputs} PARENT_SCOPE)
endfunction()
