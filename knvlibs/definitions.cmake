# Writes OUTPUT, a C++ source with the signature of the catalogue text TEXT and the date of the
# sources in the directory SOURCE, so that whoever builds them gets the same bytes: that of
# SOURCE_DATE_EPOCH in the environment, else of the commit, else of the last release. An output that
# would not change is left alone.
function(commit_date result)
  if(EXISTS "${SOURCE}/.git")
    # Of a clone that is another user's the date is asked all the same: nothing of it is run.
    execute_process(COMMAND git -c safe.directory=* -C "${SOURCE}" log -1 --format=%ct
      RESULT_VARIABLE failed OUTPUT_VARIABLE seconds ERROR_VARIABLE why
      OUTPUT_STRIP_TRAILING_WHITESPACE ERROR_STRIP_TRAILING_WHITESPACE)
    if(failed)
      message(WARNING "The date of the commit cannot be read, that of the last release is taken: "
        "${failed}: ${why}")
    endif()
  endif()
  set(${result} "${seconds}" PARENT_SCOPE)
endfunction()

function(release_date result)
  file(STRINGS "${SOURCE}/packaging/debian/changelog" line REGEX "^ -- " LIMIT_COUNT 1)
  string(REGEX REPLACE ".*>  " "" date "${line}")
  execute_process(COMMAND date --date=${date} +%s
    OUTPUT_VARIABLE seconds OUTPUT_STRIP_TRAILING_WHITESPACE COMMAND_ERROR_IS_FATAL ANY)
  set(${result} "${seconds}" PARENT_SCOPE)
endfunction()

set(seconds "$ENV{SOURCE_DATE_EPOCH}")
if(seconds STREQUAL "")
  commit_date(seconds)
endif()
if(seconds STREQUAL "")
  release_date(seconds)
endif()
if(NOT seconds MATCHES "^[0-9]+$")
  message(FATAL_ERROR "SOURCE_DATE_EPOCH is not a number of seconds: ${seconds}")
endif()

set(ENV{SOURCE_DATE_EPOCH} "${seconds}")
string(TIMESTAMP built "%b %d %Y %H:%M:%S" UTC)
file(MD5 "${TEXT}" signature)
file(CONFIGURE OUTPUT "${OUTPUT}" @ONLY CONTENT "#include \"knvlibs/source.h\"

const ksi::Definitions ksi::kDefinitions = {\"${signature}\", \"${built}\"};
")
