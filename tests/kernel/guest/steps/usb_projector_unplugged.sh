load_usb
make_channels
binding=/rig/usb_projector.json
# judge_unplugged NAME OPTION...: while a camera is unplugged at that moment.
judge_unplugged() {
  local name=$1
  shift
  connect_cameras camera_$name 2 "$@"
  judge_projector judged_$name 30 3
  disconnect_cameras camera_$name
}
for frames in 0 10 29; do
  judge_unplugged $frames --unplug-after $frames
done
for moment in commit start stop; do
  judge_unplugged at_$moment --unplug-at $moment
done
connect_cameras next_camera 2
judge_projector next 30 10
run dark_after video_control "$(usb_buses 1)" capture get Gain
disconnect_cameras next_camera
