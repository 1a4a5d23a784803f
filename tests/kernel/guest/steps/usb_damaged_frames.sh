load_usb
# The driver looks at the parameter when a camera is connected.
nodrop=/sys/module/uvcvideo/parameters/nodrop
faults='--damage-every 10 --short-every 7 --formats GREY'
connect_cameras dropped_camera 2 $faults
probe_machine
judge_camera dropped
disconnect_cameras dropped_camera
echo 1 >$nodrop
connect_cameras kept_camera 2 $faults
judge_camera kept
disconnect_cameras kept_camera
echo 0 >$nodrop
healthy_usb_again
