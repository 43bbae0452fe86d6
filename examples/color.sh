#!/bin/bash
# Calibrates the color sensor of a simulated handset, step by step as an operator would: an infrared lamp, three light
# sources, and then two others to verify it.
#
#   examples/color.sh [BUILD]          with the embedded hub; BUILD is the build folder (build/dev)
#   examples/color.sh --hub [BUILD]    with vantle-hub, in real time
set -euo pipefail

# shellcheck source=examples/handset.sh
source "$(dirname "$0")/handset.sh"

under() { # "KEY=VALUE ..." of the light, the command's words
  echo "\$ vantle -q -d p2m2 color ${*:2}"
  in_world p2m2 "$1" -d p2m2 color "${@:2}"
}

prepare
echo "== what it reads before =="
under 'world.illuminance=700 world.color_temperature=5200' -c 700 5200

echo "== infrared lamp and three light sources, the last of which computes and stores =="
under 'world.illuminance=0 world.infrared=5' -c
under 'world.illuminance=500 world.color_temperature=2800' 500 2800
under 'world.illuminance=200 world.color_temperature=4000' 200 4000
under 'world.illuminance=1000 world.color_temperature=6500' -w 1000 6500

echo "== two other lights, within 1 % =="
under 'world.illuminance=700 world.color_temperature=5200' -v 1 700 5200
under 'world.illuminance=350 world.color_temperature=3200' -v 1 350 3200
