load_devices
make_channels
lit() { video_control platform:vivid-004 capture get Boolean; }
dark() { [ "$(lit)" = 0 ]; }
# Kills the process of the diagnostic, which has the camera open, and then the program itself.
holders() {
  local node link
  node=$(video_control platform:vivid-004 capture path)
  for link in /proc/[0-9]*/fd/*; do
    if [ "$(readlink "$link")" = "$node" ]; then echo "$link" | cut -d/ -f3; fi
  done | sort -un
}
kill_holders() { lit; kill -KILL $(holders | head -n 1); }
kill_program() { lit; kill -KILL $program; }
fault() {
  diagnose "$1" TesselFaultDiagnostic --set experiment.frameCount=900 --set timeout=30 --set analysis.frameCount=90
}
when_streaming platform:vivid-004 kill_holders
fault diagnostic_killed
wait
run dark_after_diagnostic until_true 2 dark

quazor run TesselFaultDiagnostic --phone linux:vivid --profile none --set experiment.frameCount=900 --set timeout=30 \
  --set analysis.frameCount=90 >"$out/program.stdout" 2>&1 &
program=$!
count_buffers
until_true 10 streaming platform:vivid-004
run lit_before_kill lit
kill -KILL $program
wait
run dark_after_program until_true 2 dark
healthy_again
