load_usb
connect_cameras before 2
probe_machine
disconnect_cameras before
for frames in 0 1 2 3 5 8 13 21 34 55; do
  connect_cameras camera_$frames 2 --unplug-after $frames
  judge_camera after_$frames
  disconnect_cameras camera_$frames
done
healthy_usb_again
