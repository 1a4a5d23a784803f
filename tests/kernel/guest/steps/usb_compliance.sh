load_usb
connect_cameras camera 2
bus=$(usb_buses 1)
run capture v4l2-compliance --no-progress --streaming 30 --stream-all-formats 3 -d "$(video_control "$bus" capture path)"
# The metadata node delivers nothing while the camera does not stream.
run metadata v4l2-compliance --no-progress -d "$(video_control "$bus" metadata path)"
disconnect_cameras camera
