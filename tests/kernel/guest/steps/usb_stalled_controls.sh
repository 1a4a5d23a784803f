load_usb
connect_cameras camera 2 --stall contrast:GET_DEF
probe_machine
judge_camera single
disconnect_cameras camera
binding=/rig/usb_projector.json
make_channels
connect_cameras exposure_camera 2 --stall exposure-mode:GET_DEF
judge_projector exposure 30 5
disconnect_cameras exposure_camera
connect_cameras set_camera 2 --stall exposure-mode:SET_CUR
judge_projector set 30 5
disconnect_cameras set_camera
