"""Mounts on the folder given a file system that nobody serves, and keeps it so until it is ended."""

import ctypes
import os
import signal
import sys

server = os.open("/dev/fuse", os.O_RDWR)
libc = ctypes.CDLL(None, use_errno=True)
options = f"fd={server},rootmode=40000,user_id=0,group_id=0,allow_other"
NOSUID_NODEV = 6
if libc.mount(b"hung", sys.argv[1].encode(), b"fuse", NOSUID_NODEV, options.encode()) != 0:
    sys.exit(os.strerror(ctypes.get_errno()))
signal.pause()
