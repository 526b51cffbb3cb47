# Copies FILES (paths in SOURCE) to the folder COPY and applies PATCH there. Fails when the patch does not
# apply as it stands: cmake -D SOURCE=… -D COPY=… -D PATCH=… -D FILES=a,b -P apply_fault.cmake
string(REPLACE "," ";" FILES "${FILES}")
foreach(file ${FILES})
  file(READ "${SOURCE}/${file}" text)
  file(WRITE "${COPY}/${file}" "${text}")
endforeach()
execute_process(
  COMMAND patch -p1 --fuzz=0 --no-backup-if-mismatch --reject-file=- -i "${PATCH}"
  WORKING_DIRECTORY "${COPY}"
  OUTPUT_VARIABLE output ERROR_VARIABLE output RESULT_VARIABLE failed)
if(failed)
  message(FATAL_ERROR "${PATCH} does not apply any more:\n${output}")
endif()
