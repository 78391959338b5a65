# Fails when FILE is larger than LIMIT bytes.
file(SIZE "${FILE}" size)
if(size GREATER LIMIT)
  message(FATAL_ERROR "${FILE} is ${size} bytes, above its budget of ${LIMIT}")
endif()
message(STATUS "${FILE}: ${size} of ${LIMIT} bytes")
