# The API reference: `cmake --build build --target docs` writes it to build/docs/html/index.html when
# Doxygen is installed. It is not part of the default build, and Doxygen's warnings fail nothing.
#
# The headers keep plain `//` comments; docs/api/comment_filter.awk turns the comments directly above
# a declaration (and after a member) into documentation while Doxygen reads them.
find_package(Doxygen QUIET)
if(NOT DOXYGEN_FOUND)
  return()
endif()
find_program(SSAOPT_AWK NAMES awk mawk gawk)
if(NOT SSAOPT_AWK)
  message(STATUS "awk not found: no docs target")
  return()
endif()

set(DOXYGEN_PROJECT_NAME ssaopt)
set(DOXYGEN_PROJECT_NUMBER ${PROJECT_VERSION})
set(DOXYGEN_PROJECT_BRIEF "Control-flow graphs of generated C programs in SSA form, and their optimisation")
set(DOXYGEN_OUTPUT_DIRECTORY ${PROJECT_BINARY_DIR}/docs)
set(DOXYGEN_FILE_PATTERNS *.h *.md)
set(DOXYGEN_FILTER_PATTERNS "*.h=${SSAOPT_AWK} -f ${PROJECT_SOURCE_DIR}/docs/api/comment_filter.awk")
set(DOXYGEN_USE_MDFILE_AS_MAINPAGE ${PROJECT_SOURCE_DIR}/README.md)
# Names as a front end includes them: <ssaopt/frame/pool.h>, <ssaopt/client/printer.h>.
set(DOXYGEN_FULL_PATH_NAMES YES)
set(DOXYGEN_STRIP_FROM_PATH ${PROJECT_SOURCE_DIR}/include ${PROJECT_SOURCE_DIR}/client/include ${PROJECT_SOURCE_DIR})
set(DOXYGEN_STRIP_FROM_INC_PATH ${PROJECT_SOURCE_DIR}/include ${PROJECT_SOURCE_DIR}/client/include)
# Every public class and member appears, commented or not; the library's inner workings do not.
set(DOXYGEN_EXTRACT_ALL YES)
set(DOXYGEN_EXTRACT_STATIC YES)
set(DOXYGEN_EXCLUDE_SYMBOLS detail *::detail)
set(DOXYGEN_WARN_IF_UNDOCUMENTED NO)
# The first sentence of a comment is its summary in member lists.
set(DOXYGEN_JAVADOC_AUTOBRIEF YES)
set(DOXYGEN_SORT_MEMBER_DOCS NO)
# The allocation macro gives classes operators, not members worth listing.
set(DOXYGEN_MACRO_EXPANSION YES)
set(DOXYGEN_EXPAND_ONLY_PREDEF YES)
set(DOXYGEN_PREDEFINED "SSAOPT_MODULE_ALLOCATED=")
set(DOXYGEN_HAVE_DOT NO)
set(DOXYGEN_QUIET YES)
set(DOXYGEN_WARN_LOGFILE ${PROJECT_BINARY_DIR}/docs/warnings.log)

doxygen_add_docs(docs
  ${PROJECT_SOURCE_DIR}/README.md
  ${PROJECT_SOURCE_DIR}/docs
  ${PROJECT_SOURCE_DIR}/include/ssaopt
  ${PROJECT_SOURCE_DIR}/client/include/ssaopt
  WORKING_DIRECTORY ${PROJECT_SOURCE_DIR}
  COMMENT "API reference in ${PROJECT_BINARY_DIR}/docs/html")
