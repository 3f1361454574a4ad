# Copies a library into the Python package. What it needs is loaded before it, or is the system's: a
# search path of the build tree would end in the user's current directory.
#
#   cmake -D FROM=libkzcat.so.1.0.0 -D TO=kzsdk/_libraries/libkzcat.so.1 -P copy_library.cmake
cmake_minimum_required(VERSION 3.22)

file(COPY_FILE "${FROM}" "${TO}")
file(RPATH_REMOVE FILE "${TO}")
