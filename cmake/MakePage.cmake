# Makes the template of the page: cmake -DLIBRARY=FILES -DLICENSES=FILES -DWEB=DIR -DTEMPLATE=OUT -P ...
#
# It is WEB/page.html with WEB/page.css, the files of LIBRARY and the modules of WEB in it. The page
# may run these scripts and take this style, known by their hashes, and nothing else. LICENSES are
# those of the files of LIBRARY, in Debian's form; a text that several refer to stands in the page
# once.
cmake_minimum_required(VERSION 3.25)

# Each stands behind those that it imports.
set(modules bytes data tables lines memory comparison format times dom state balance treemap chart timeline
  line_chart grid changes reports header address main)

# The hash of a text as a Content-Security-Policy has it.
function(hash_of text result)
  set(digits ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/)
  string(SHA256 hex "${text}")
  string(APPEND hex 00) # to a multiple of three bytes
  set(base64 "")
  foreach(at RANGE 0 60 6)
    string(SUBSTRING "${hex}" ${at} 6 piece)
    foreach(shift 18 12 6 0)
      math(EXPR digit "(0x${piece} >> ${shift}) & 63")
      string(SUBSTRING "${digits}" ${digit} 1 digit)
      string(APPEND base64 "${digit}")
    endforeach()
  endforeach()
  string(SUBSTRING "${base64}" 0 43 base64)
  set(${result} "'sha256-${base64}='" PARENT_SCOPE)
endfunction()

# A module as a function that gives its exports: a page has no other files to import.
function(module_of name result)
  file(READ "${WEB}/${name}.js" text)
  string(REGEX MATCHALL "\nexport (async )?(function|const|class) [A-Za-z_]+" exports "${text}")
  list(TRANSFORM exports REPLACE ".* " "")
  list(JOIN exports ", " exports)
  string(REGEX REPLACE "\nimport ({[^}]*}) from './([a-z_]+)\\.js'" "\nconst \\1 = module_\\2" text "${text}")
  string(REGEX REPLACE "\nexport " "\n" text "${text}")
  set(${result} "const module_${name} = (() => {\n${text}return {${exports}};\n})();\n" PARENT_SCOPE)
endfunction()

# A file without the texts of licenses that are in the property SAID, to which it adds its own.
function(license_of file result)
  file(READ "${file}" text)
  string(REPLACE ";" "\\;" text "${text}") # else it would end a paragraph, too
  string(REGEX REPLACE "\n\n+" ";" paragraphs "${text}")
  get_property(said GLOBAL PROPERTY SAID)
  set(license "")
  foreach(paragraph IN LISTS paragraphs)
    string(STRIP "${paragraph}" paragraph)
    string(SHA256 hash "${paragraph}")
    if(NOT hash IN_LIST said)
      string(APPEND license "${paragraph}\n\n")
    endif()
    if(paragraph MATCHES "^License:")
      list(APPEND said ${hash})
    endif()
  endforeach()
  set_property(GLOBAL PROPERTY SAID "${said}")
  set(${result} "${license}" PARENT_SCOPE)
endfunction()

set(licenses "")
foreach(file IN LISTS LICENSES)
  license_of("${file}" license)
  string(APPEND licenses "${license}")
endforeach()
set(library "\n/*\n${licenses}*/\n")
foreach(file IN LISTS LIBRARY)
  file(READ "${file}" text)
  string(APPEND library "${text}")
endforeach()

set(script "\n'use strict';\n")
foreach(module IN LISTS modules)
  module_of(${module} text)
  string(APPEND script "${text}")
endforeach()

file(READ "${WEB}/page.css" style)
foreach(text library script style)
  if("${${text}}" MATCHES "</")
    message(FATAL_ERROR "the page's ${text} has </ in it, which would end it")
  endif()
  hash_of("${${text}}" ${text}_hash)
endforeach()
set(policy "default-src 'none'; script-src ${library_hash} ${script_hash}; style-src ${style_hash}; base-uri 'none'; form-action 'none'")

file(READ "${WEB}/page.html" page)
foreach(text policy style library script)
  string(REPLACE "{{${text}}}" "${${text}}" page "${page}")
endforeach()
file(WRITE "${TEMPLATE}" "${page}")
