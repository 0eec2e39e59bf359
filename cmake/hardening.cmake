# What is shipped is built to fail safely on memory faults; debug builds have the sanitizers.
include(CheckCompilerFlag)
include(CheckPIESupported)
check_pie_supported()
check_compiler_flag(CXX -fcf-protection has_cf_protection) # x86 only

set(shipped $<CONFIG:Release,RelWithDebInfo>)
foreach(option -U_FORTIFY_SOURCE -D_FORTIFY_SOURCE=2 -fstack-protector-strong -fstack-clash-protection
    $<$<BOOL:${has_cf_protection}>:-fcf-protection>)
  add_compile_options($<${shipped}:${option}>)
endforeach()
add_link_options($<${shipped}:-Wl,-z,relro,-z,now>)
