load_usb
make_channels
binding=/rig/usb_projector.json
connect_cameras camera 2
bus=$(usb_buses 1)
fault() {
  judge "$1" TesselFaultDiagnostic --set experiment.frameCount=60 --set timeout=10 --set analysis.frameCount=60
}
# The same, with the kernel's trace of both nodes.
traced_fault() {
  trace_frames
  fault "$1"
  keep_trace "$1" "$bus"
  echo "metadata $(minor_of "$bus" metadata)" >>"$out/$1.minors"
}
traced_fault driver_stamps
echo 1 >/sys/module/uvcvideo/parameters/hwtimestamps
traced_fault device_stamps
# The driver stamps the metadata otherwise.
binding=$out/by_time.json
sed 's/"format": "UVCH"/"pairing": "timestamp", &/' /rig/usb_projector.json >"$binding"
fault paired_by_time
echo 0 >/sys/module/uvcvideo/parameters/hwtimestamps
run dark_after video_control "$bus" capture get Gain
disconnect_cameras camera
