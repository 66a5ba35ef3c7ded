#!/bin/sh
# Compiles as it is told, and with the flags that mutate.py adds for a changed line.
# shellcheck disable=SC2086 # several flags
exec ccache "$@" $MUTATION_FLAGS
