# Writes the manual pages that the program makes from its options and commands: man1/vexg.1,
# man1/vexg-VERB.1 for each verb and man7/NAME.7 for each command. Called with -DVEXG=the program
# -DTO=the folder.
file(REMOVE_RECURSE ${TO}/man1 ${TO}/man7)
file(MAKE_DIRECTORY ${TO}/man1 ${TO}/man7)

function(write_page file)
  execute_process(COMMAND ${VEXG} help --man ${ARGN} OUTPUT_FILE ${TO}/${file}
    COMMAND_ERROR_IS_FATAL ANY)
endfunction()

write_page(man1/vexg.1)
execute_process(COMMAND ${VEXG} help --json OUTPUT_VARIABLE verbs COMMAND_ERROR_IS_FATAL ANY)
string(JSON count LENGTH ${verbs} verbs)
math(EXPR last "${count} - 1")
foreach(i RANGE ${last})
  string(JSON name GET ${verbs} verbs ${i} name)
  write_page(man1/vexg-${name}.1 ${name})
endforeach()

execute_process(COMMAND ${VEXG} commands --names OUTPUT_VARIABLE commands
  OUTPUT_STRIP_TRAILING_WHITESPACE COMMAND_ERROR_IS_FATAL ANY)
string(REPLACE "\n" ";" commands "${commands}")
foreach(name IN LISTS commands)
  write_page(man7/${name}.7 ${name})
endforeach()
