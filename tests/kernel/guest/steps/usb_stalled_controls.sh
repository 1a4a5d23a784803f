load_usb
connect_cameras camera 2 --stall contrast:GET_DEF
probe_machine
judge_camera single
disconnect_cameras camera
binding=/rig/usb_projector.json
make_channels
fault() {
  judge "$1" TesselFaultDiagnostic --set experiment.frameCount=30 --set timeout=5 --set analysis.frameCount=30
}
connect_cameras exposure_camera 2 --stall exposure-mode:GET_DEF
fault exposure
disconnect_cameras exposure_camera
connect_cameras set_camera 2 --stall exposure-mode:SET_CUR
fault set
disconnect_cameras set_camera
