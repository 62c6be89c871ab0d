# Writes the manual pages that the program makes from its options: vexg.1, and vexg-VERB.1 for each
# verb. Called with -DVEXG=the program -DTO=the folder.
execute_process(COMMAND ${VEXG} help --json OUTPUT_VARIABLE verbs COMMAND_ERROR_IS_FATAL ANY)
file(REMOVE_RECURSE ${TO})
file(MAKE_DIRECTORY ${TO})
execute_process(COMMAND ${VEXG} help --man OUTPUT_FILE ${TO}/vexg.1 COMMAND_ERROR_IS_FATAL ANY)
string(JSON count LENGTH ${verbs} verbs)
math(EXPR last "${count} - 1")
foreach(i RANGE ${last})
  string(JSON name GET ${verbs} verbs ${i} name)
  execute_process(COMMAND ${VEXG} help --man ${name} OUTPUT_FILE ${TO}/vexg-${name}.1
    COMMAND_ERROR_IS_FATAL ANY)
endforeach()
