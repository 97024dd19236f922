# clang-tidy as a build step. A file is checked whenever its object has been rebuilt; a stamp beside
# the object records a clean result.
find_program(CLANG_TIDY clang-tidy REQUIRED)
set(tidy_settings .clang-tidy bench/.clang-tidy tests/.clang-tidy)
list(TRANSFORM tidy_settings PREPEND ${PROJECT_SOURCE_DIR}/)

# tidy(TARGET CHECKS FOLDER...): a target that looks at all that is compiled in these folders and
# below, with .clang-tidy's checks and these changes to them.
function(tidy target checks)
  set(stamps)
  foreach(folder IN LISTS ARGN)
    collect_stamps(${folder})
  endforeach()
  add_custom_target(${target} DEPENDS ${stamps})
endfunction()

# Adds the stamps of a folder and of those below to the caller's list.
function(collect_stamps folder)
  get_property(targets DIRECTORY ${folder} PROPERTY BUILDSYSTEM_TARGETS)
  get_property(objects DIRECTORY ${folder} PROPERTY BINARY_DIR)
  foreach(compiled IN LISTS targets)
    get_target_property(sources ${compiled} SOURCES)
    # An absolute path is a generated file or belongs to another target.
    list(FILTER sources INCLUDE REGEX "^[^/].*\\.cpp$")
    foreach(source IN LISTS sources)
      set(object ${objects}/CMakeFiles/${compiled}.dir/${source}.o)
      set(stamp ${object}.${target})
      add_custom_command(OUTPUT ${stamp}
        COMMAND ${CLANG_TIDY} --quiet --checks=${checks} -p ${PROJECT_BINARY_DIR}
                ${folder}/${source}
        COMMAND ${CMAKE_COMMAND} -E touch ${stamp}
        DEPENDS ${object} ${tidy_settings}
        COMMENT "clang-tidy ${source}" VERBATIM)
      list(APPEND stamps ${stamp})
    endforeach()
  endforeach()
  get_property(below DIRECTORY ${folder} PROPERTY SUBDIRECTORIES)
  foreach(each IN LISTS below)
    collect_stamps(${each})
  endforeach()
  set(stamps ${stamps} PARENT_SCOPE)
endfunction()

# Uses clang's compile commands. The static analyzer takes most of the time, the tests most of the
# rest.
set(code ${PROJECT_SOURCE_DIR}/src)
foreach(part support tolkwd-check tolkwd-report)
  list(APPEND code ${PROJECT_SOURCE_DIR}/tools/${part})
endforeach()
if(TOLKWD_SANITIZE MATCHES address)
  tidy(tidy -clang-analyzer-*,-bugprone-reserved-identifier ${code})
  tidy(tidy_all "" ${code} ${PROJECT_SOURCE_DIR}/tests)
elseif(TOLKWD_BENCH)
  # What is not compiled with a sanitizer.
  tidy(tidy_all "" ${PROJECT_SOURCE_DIR}/bench ${PROJECT_SOURCE_DIR}/tests/support/stepclock
       ${PROJECT_SOURCE_DIR}/tests/report/page)
endif()
