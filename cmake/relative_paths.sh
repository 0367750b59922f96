#!/usr/bin/env bash
# Compiler and linker launcher of the clang Windows build
# (cmake/debug_info.cmake): clang writes its whole command line into the
# CodeView of every object, and lld its own into the PDB. Run from the build
# folder, they get the source folder's paths relative to there (`../..` in a
# preset's build/NAME, which holds the build folder), the prefix maps
# included, and compiles a fixed compilation folder: the PDB names no folder
# of the build machine, and two folders give the same bytes.
#   relative_paths.sh SOURCE_DIR PREFIX COMPILER ARGS...
set -euo pipefail
source_dir=$1 prefix=$2
shift 2
relative=$(realpath --relative-to=. "$source_dir")
args=()
for arg in "$@"; do args+=("${arg//"$source_dir"/"$relative"}"); done
case " $* " in
*" -c "*) exec "${args[@]}" "-fdebug-compilation-dir=$prefix" -fcoverage-compilation-dir=. ;;
*) exec "${args[@]}" ;;
esac
