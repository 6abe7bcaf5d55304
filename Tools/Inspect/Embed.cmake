# The inspect report is one self-contained HTML file: the chart library (Debian's libjs-dygraphs)
# and our page template, script and style are compiled into the program that writes it.
#
# zelto_embed_inspect_assets(TARGET) adds a generated source that defines the assets declared in
# Tools/InspectAssets.h.
set(ZELTO_DYGRAPHS_DIR /usr/share/javascript/dygraphs CACHE PATH "Where libjs-dygraphs installs dygraphs")
set(_zelto_inspect_dir ${CMAKE_CURRENT_LIST_DIR})

function(zelto_embed_inspect_assets target)
  foreach(file dygraph.min.js dygraph.min.css)
    if(NOT EXISTS ${ZELTO_DYGRAPHS_DIR}/${file})
      message(FATAL_ERROR "zelto-touch inspect needs ${ZELTO_DYGRAPHS_DIR}/${file}: install libjs-dygraphs")
    endif()
  endforeach()
  # Variable name in InspectAssets.h, then the file it holds.
  set(assets
    dygraphsScript ${ZELTO_DYGRAPHS_DIR}/dygraph.min.js
    dygraphsStyle ${ZELTO_DYGRAPHS_DIR}/dygraph.min.css
    pageTemplate ${_zelto_inspect_dir}/inspect.html
    pageScript ${_zelto_inspect_dir}/inspect.js
    pageStyle ${_zelto_inspect_dir}/inspect.css)
  set(files ${assets})
  list(FILTER files INCLUDE REGEX "/")
  set(output ${CMAKE_CURRENT_BINARY_DIR}/InspectAssets_${target}.cpp)
  string(REPLACE ";" "|" assets_arg "${assets}")
  add_custom_command(
    OUTPUT ${output}
    COMMAND ${CMAKE_COMMAND} "-DASSETS=${assets_arg}" -DOUTPUT=${output} -P ${_zelto_inspect_dir}/EmbedFiles.cmake
    DEPENDS ${files} ${_zelto_inspect_dir}/EmbedFiles.cmake
    COMMENT "Embedding the inspect page's assets"
    VERBATIM)
  target_sources(${target} PRIVATE ${output})
endfunction()
