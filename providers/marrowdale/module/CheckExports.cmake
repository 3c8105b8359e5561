# Fails unless the module's dynamic symbols are exactly its entry point.
execute_process(COMMAND "${NM}" -D --defined-only --format=posix "${MODULE}"
  OUTPUT_VARIABLE listing COMMAND_ERROR_IS_FATAL ANY)
string(STRIP "${listing}" listing)
string(REGEX REPLACE " [^\n]*" "" symbols "${listing}")
if(NOT symbols STREQUAL "MarrowdaleCreateExtension")
  message(FATAL_ERROR "exports other symbols than MarrowdaleCreateExtension:\n${symbols}")
endif()
