load_usb
connect_cameras before 2
probe_machine
disconnect_cameras before
judge_camera absent
for moment in commit start stop; do
  connect_cameras ${moment}_camera 2 --unplug-at $moment
  judge_camera $moment
  disconnect_cameras ${moment}_camera
done
connect_cameras streaming_camera 2 --unplug-after 20 --bulk
judge_camera streaming
disconnect_cameras streaming_camera
healthy_usb_again
