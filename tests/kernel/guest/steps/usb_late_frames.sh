load_usb
connect_cameras late_camera 2 --late-every 10 --late-by 25
probe_machine
jitter=5
judge_camera late
jitter=
disconnect_cameras late_camera
connect_cameras mute_camera 2 --mute-after 30
judge_camera mute
disconnect_cameras mute_camera
connect_cameras silent_camera 2 --mute-after 0
judge_camera silent
disconnect_cameras silent_camera
healthy_usb_again
