# Links in everything but the C library, so that a program runs wherever there is one. To be included before
# the libraries are looked for and before any target is made.
set(CMAKE_FIND_LIBRARY_SUFFIXES .a)

find_package(ICU REQUIRED COMPONENTS i18n uc data)
target_link_libraries(ICU::i18n INTERFACE ICU::uc)
target_link_libraries(ICU::uc INTERFACE ICU::data)

# The map tells packaging/release/bill-of-materials what was linked in.
add_link_options(-static-libstdc++ -static-libgcc -Wl,--gc-sections -Wl,-Map=$<TARGET_PROPERTY:NAME>.map)

add_library(qel_older_glibc OBJECT packaging/release/OlderGlibc.cpp)
target_link_libraries(qel_older_glibc PRIVATE qel_options)
link_libraries(qel_older_glibc)

# The same bytes, wherever the sources stand.
add_compile_options(-ffile-prefix-map=${PROJECT_SOURCE_DIR}/=)
