# Counts what runs, in the directories that are added while this holds.
#
# The counters lie in files from the start (%c) and are not written at the end: so they hold what a
# process has done that is killed, that leaves by _exit or that has another root by then. Processes
# of the same program add to the same file (%m), and so do their threads and children, hence atomic.
add_compile_options(
  -fprofile-instr-generate=${PROJECT_BINARY_DIR}/counts/%m%c.profraw
  -fcoverage-mapping
  -fprofile-update=atomic
  "SHELL:-mllvm -runtime-counter-relocation")
add_link_options(-fprofile-instr-generate)
