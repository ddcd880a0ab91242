# The program lumra, without its main. Not built where the program is not.
if(TARGET lumra_program)
  foreach(name program_containers program_metadata program_options program_samples)
    lumra_fuzz_target(${name} SOURCES ${name}.cpp LIBRARIES lumra_program)
  endforeach()
endif()
