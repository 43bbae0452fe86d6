#!/bin/bash
# Calibrates the light sensor under the display of a simulated handset, as an operator would: its upper gains, the
# moment of the display's refresh at which it integrates (by delay, then by TE2 edge), the boundary of the display's
# pulses, what a white picture adds, and lux. Then it verifies lux with the display off, on, and pulsing.
#
#   examples/als-under-display.sh [BUILD]          with the embedded hub; BUILD is the build folder (build/dev)
#   examples/als-under-display.sh --hub [BUILD]    with vantle-hub, in real time
set -euo pipefail
# shellcheck source=examples/handset.sh
source "$(dirname "$0")/handset.sh"

handset=t5h5
itime=1000 # µs: short, so that it fits into the dark moment of a refresh
samples=8

als() { # "KEY=VALUE ..." of the world, the command's words; what it printed is in $folder/output
  local settings=$1
  shift
  if ! in_world "$handset" "$settings" -d "$handset" als -s "$samples" "$@" > "$folder/output"; then
    cat "$folder/output"
    return 1
  fi
}

show() { # pattern of the lines to show
  grep -E "$1" "$folder/output" | sed 's/^/   /'
}

light() { echo "world.illuminance=$1 world.display_brightness=$2"; } # lux, brightness of a white picture

clear_level() { # what C reads with the display on
  als "$(light 300 128)" sample
  echo "-- with the display on:"
  show '^C_MEAN'
}

prepare

echo "== gain: one light, one step for each of the upper settings =="
als "$(light 2000 0)" -r calgain "$itime" 8
als "$(light 2000 0)" calgain "$itime" 9
als "$(light 2000 0)" calgain "$itime" 10
als "$(light 2000 0)" -w calgain "$itime" 11
show '_gain_ratio_|^Calibration'

echo "== delay: a scan over most of a refresh =="
clear_level
als "$(light 300 128)" caldelay "$itime" 11 0 12 1
show '^DELAY FIT|^Delay of|^Calibration'
delay=$(awk '/^Delay of minimum/ { print $NF }' "$folder/output")
clear_level

echo "== TE2: the display's edge, with that delay =="
als "$(light 300 128)" caldelay_te2 "$itime" 11 "$delay" 600 1800 100
show '^DELAY FIT|^Delay of|^Calibration'
clear_level

echo "== PWM: one step for each brightness; C is smallest where the pulses end =="
als "$(light 300 24)" -r pwm "$itime" 11 24
for brightness in 40 56 72 88 104; do als "$(light 300 $brightness)" pwm "$itime" 11 $brightness; done
als "$(light 300 120)" -w pwm "$itime" 11 120
show '^PWM boundary|^Calibration'

echo "== white: what the display adds, in the dark =="
als "$(light 0 80)" -r white 80
als "$(light 0 160)" white 160
als "$(light 0 240)" -w white 240
show '^PATTERN|^Calibration'

echo "== lux: display off =="
als "$(light 500 0)" -w 500 5000
show '^LUX_SCALE|^Calibration'

verify() { # lux, brightness
  echo "== verification: $1 lx, display at $2 =="
  als "$(light "$1" "$2")" -v 2 "$1"
  show '^MEAN|^DIFF|^Verification'
}
verify 500 0
verify 1200 128
verify 1200 255
verify 1200 30
