# Readers of outside data in the lab: the state files of a state folder.
tav_fuzz_target(fuzz_lab_state_file SOURCES ${CMAKE_CURRENT_LIST_DIR}/FuzzLabStateFile.cpp
  DEPS tav_lab)
