# Writes the source of the page's files: their bytes, and the same compressed.
#
#   cmake -D PAGE=<folder> -D OUTPUT=<file.cpp> -D GZIP=<program> -P embed.cmake
#
# A browser gets what it asks for without any work, and the program needs no library for it.

# Sets `variable` to an array's elements: the bytes of a file.
function(bytes_of variable file)
  file(READ ${file} bytes HEX)
  string(REGEX REPLACE "(................................)" "\\1\n" bytes "${bytes}")
  string(REGEX REPLACE "([0-9a-f][0-9a-f])" "0x\\1," bytes "${bytes}")
  set(${variable} "${bytes}" PARENT_SCOPE)
endfunction()

set(source "// Made by ctl/console/embed.cmake.\n#include \"ctl/console/embedded_page.h\"\n
namespace console {
namespace {

")
set(rows "")
set(number 0)
foreach(file_and_type "index.html|text/html; charset=utf-8" "app.js|text/javascript; charset=utf-8"
                      "app.css|text/css; charset=utf-8" "icon.svg|image/svg+xml")
  string(REGEX REPLACE "\\|.*" "" name "${file_and_type}")
  string(REGEX REPLACE ".*\\|" "" type "${file_and_type}")
  # Without name and time, so that the same page makes the same program.
  execute_process(COMMAND ${GZIP} -9nc ${PAGE}/${name} OUTPUT_FILE ${OUTPUT}.gz RESULT_VARIABLE failed)
  if(failed)
    message(FATAL_ERROR "${GZIP} cannot compress ${PAGE}/${name}")
  endif()
  bytes_of(plain ${PAGE}/${name})
  bytes_of(compressed ${OUTPUT}.gz)
  file(REMOVE ${OUTPUT}.gz)
  string(APPEND source "constexpr unsigned char kPlain${number}[] = {\n${plain}};\n"
                       "constexpr unsigned char kGzip${number}[] = {\n${compressed}};\n")
  string(APPEND rows "        {\"/${name}\", \"${type}\", textOf(kPlain${number}), textOf(kGzip${number})},\n")
  math(EXPR number "${number} + 1")
endforeach()
string(APPEND source "
template <std::size_t size>
std::string textOf(const unsigned char (&bytes)[size]) {
    return {reinterpret_cast<const char*>(bytes), size};
}

}  // namespace

std::vector<PageFile> embeddedPage() {
    return {
${rows}    };
}

}  // namespace console
")
file(WRITE ${OUTPUT} "${source}")
