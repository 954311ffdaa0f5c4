# What every target of the project is compiled with.
set(CMAKE_CXX_STANDARD 17)
set(CMAKE_CXX_STANDARD_REQUIRED ON)
set(CMAKE_CXX_EXTENSIONS OFF)
set(CMAKE_CXX_VISIBILITY_PRESET hidden)
set(CMAKE_VISIBILITY_INLINES_HIDDEN ON)
set(CMAKE_EXPORT_COMPILE_COMMANDS ON)
set(CMAKE_POSITION_INDEPENDENT_CODE ON)

add_library(teiseigatro_options INTERFACE)
target_compile_options(teiseigatro_options INTERFACE
  -Wall -Wextra -Wpedantic -Wshadow -Wconversion
  $<$<BOOL:${TEISEIGATRO_WERROR}>:-Werror>)

# What is built does not depend on the directories that it is built from and in. The later of the two
# holds, which may lie in the other. What counts coverage looks for the sources by their paths.
if(NOT TEISEIGATRO_COVERAGE)
  add_compile_options(-ffile-prefix-map=${PROJECT_SOURCE_DIR}=.
                      -ffile-prefix-map=${PROJECT_BINARY_DIR}=./build)
endif()

if(TEISEIGATRO_SANITIZE)
  target_compile_options(teiseigatro_options INTERFACE
    -fsanitize=${TEISEIGATRO_SANITIZE} -fno-sanitize-recover=all -fno-omit-frame-pointer)
  target_link_options(teiseigatro_options INTERFACE -fsanitize=${TEISEIGATRO_SANITIZE})
endif()

if(TEISEIGATRO_FUZZ)
  target_compile_options(teiseigatro_options INTERFACE -fsanitize=fuzzer-no-link)
  target_link_options(teiseigatro_options INTERFACE -fsanitize=fuzzer-no-link)
endif()
