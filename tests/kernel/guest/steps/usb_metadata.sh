load_usb
make_channels
binding=/rig/usb_projector.json
connect_cameras camera 2
bus=$(usb_buses 1)
# The same, with the kernel's trace of both nodes.
traced() {
  trace_frames
  judge_projector "$1" 60 10
  keep_trace "$1" "$bus"
  echo "metadata $(minor_of "$bus" metadata)" >>"$out/$1.minors"
}
traced driver_stamps
echo 1 >/sys/module/uvcvideo/parameters/hwtimestamps
traced device_stamps
# The driver stamps the metadata otherwise.
binding=$out/by_time.json
sed 's/"format": "UVCH"/"pairing": "timestamp", &/' /rig/usb_projector.json >"$binding"
judge_projector paired_by_time 60 10
echo 0 >/sys/module/uvcvideo/parameters/hwtimestamps
run dark_after video_control "$bus" capture get Gain
disconnect_cameras camera
