#!/bin/sh
# Checks the plug-in's dynamic symbol table: OpenMI is the one C (unmangled)
# function it defines. The members the host program calls are C++ symbols.
#
#   check-exports.sh PLUGIN
set -u
plugin=$1
symbols=$(nm -D --defined-only "$plugin") || { echo "cannot read the symbols of $plugin"; exit 1; }
functions=$(printf '%s\n' "$symbols" | awk '$2 ~ /^[TtWiu]$/ && $3 !~ /^_Z/ { print $3 }' | sort)
if [ "$functions" != "OpenMI" ]; then
  echo "$plugin defines these C functions, expected OpenMI alone:"
  printf '%s\n' "$functions"
  exit 1
fi
# The host's builders must stay reachable, or --sensors and --bmc break.
for member in groupAcquiredTable makeTemperatureSensorNodes makeVoltageSensorNodes makeBMCNodes; do
  printf '%s\n' "$symbols" | grep -q "SmBiosMI[0-9]*$member" ||
    { echo "$plugin does not export SmBiosMI::$member"; exit 1; }
done
echo "$plugin: OpenMI is the one C function; the host's members are exported"
