#!/bin/bash
# Calibrates accelerometer and gyroscope of two simulated handsets, one of each procedure, step by step as an operator
# would, and then lets the calibrated streams show that gravity is true.
#
#   examples/imu-multipoint.sh [BUILD]          with the embedded hub; BUILD is the build folder (build/dev)
#   examples/imu-multipoint.sh --hub [BUILD]    with vantle-hub, in real time
#
# The handset has to be somewhere else in each step.
set -euo pipefail
# shellcheck source=examples/handset.sh
source "$(dirname "$0")/handset.sh"

# The axis that points up, and the attitude that points it there.
declare -A pose=(
  [a+x]='world.pose=[0,-90,0]' [a-x]='world.pose=[0,90,0]'
  [a+y]='world.pose=[90,0,0]' [a-y]='world.pose=[-90,0,0]'
  [a+z]='world.pose=[0,0,0]' [a-z]='world.pose=[180,0,0]'
)

show_calibrated() { # handset: what the calibrated stream says in each pose, read by a step of the positional procedure
  local handset=$1 phase
  echo "-- calibrated, in six poses (9.80665 on one axis, 0 on the others):"
  for phase in a+x a-x a+y a-y a+z a-z; do
    seed=$((seed + 1)) # here, since what stands before a pipe counts for itself only
    in_world "$handset" "${pose[$phase]}" -d o1v1 imu-multipoint first |
      awk -v phase="$phase" '$1 == "ACCEL_MEAN:" { printf "%s %10.4f %10.4f %10.4f\n", phase, $2, $3, $4 }'
  done
}

per_phase() { # handset
  local handset=$1 axis first=first
  echo "== $handset: nine named phases, then the last step =="
  prepare
  for axis in x y z; do
    in_world "$handset" "${pose[a+$axis]}" -d "$handset" imu-multipoint --phase "a+$axis" $first
    # Half a turn with that axis upright, 0.2 s each to start and to stop.
    in_world "$handset" "${pose[a+$axis]} world.rotation.axis=$axis world.rotation.rate=180 \
world.rotation.angle=180 world.rotation.ramp=0.2 world.rotation.at=${rotation_start}" \
      -d "$handset" imu-multipoint --phase "g+$axis" --time "$rotation_seconds"
    in_world "$handset" "${pose[a-$axis]}" -d "$handset" imu-multipoint --phase "a-$axis"
    first=
  done
  in_world "$handset" "${pose[a+z]}" -d "$handset" imu-multipoint \
    --a+x-refx 9.80665 --a+y-refy 9.80665 --a+z-refz 9.80665 \
    --g+x-refx 3.14159265 --g+y-refy 3.14159265 --g+z-refz 3.14159265 last
  show_calibrated "$handset"
}

positional() { # handset
  local handset=$1
  echo "== $handset: six positions, the last of which solves =="
  prepare
  in_world "$handset" "${pose[a+x]}" -d "$handset" imu-multipoint first
  in_world "$handset" "${pose[a-x]}" -d "$handset" imu-multipoint
  in_world "$handset" "${pose[a+y]}" -d "$handset" imu-multipoint
  in_world "$handset" "${pose[a-y]}" -d "$handset" imu-multipoint
  in_world "$handset" "${pose[a+z]}" -d "$handset" imu-multipoint
  in_world "$handset" "${pose[a-z]}" -d "$handset" imu-multipoint last
  show_calibrated "$handset"
}

# In real time the rotation has to wait until the command has found the sensors and they have settled.
rotation_start=0.3
rotation_seconds=2
if $use_hub; then
  rotation_start=1.5
  rotation_seconds=5
fi

per_phase t5h5
positional o1v1
