"""What is done to the service and under it, each thing undone before it returns but for what it did to the trees."""

import errno
import os
import signal


def kill(soak):
    """Killed a few times, at any moment."""
    for _ in range(soak.random.randrange(1, 4)):
        soak.wait(soak.random.random() * 2)
        soak.service.kill()
        soak.service.start()


def end(soak):
    soak.service.end()
    soak.wait(soak.random.random())  # what happens now, nobody sees
    soak.service.start()


def burst(soak):
    """More events than the kernel keeps, while nobody reads them."""
    folder = soak.home + "/Documents/burst"
    os.makedirs(folder, exist_ok=True)
    soak.service.process.send_signal(signal.SIGSTOP)
    try:
        for i in range(20_000):
            path = f"{folder}/{i % 97}.{i % 3}"
            if i % 2 == 0:
                with open(path, "w"):
                    pass
            elif os.path.exists(path):
                os.unlink(path)
            os.utime(folder)
    except OSError as error:
        if error.errno != errno.ENOSPC:
            raise
    finally:
        soak.service.process.send_signal(signal.SIGCONT)


def full_disk(soak):
    """Not a byte left for some seconds; killed meanwhile, once in a while."""
    filler = soak.home + "/filler"
    try:
        with open(filler, "wb") as file:
            size = 256 << 20
            while size >= 4096:
                try:
                    os.posix_fallocate(file.fileno(), os.fstat(file.fileno()).st_size, size)
                except OSError:
                    size //= 2
            soak.wait(2 + soak.random.random() * 3)
            if soak.random.random() < 0.3:
                soak.service.kill()
    finally:
        os.unlink(filler)
        if not soak.service.is_alive():
            soak.service.start()


def clock_jumps(soak):
    """Forth and back by hours and days. It stays where the last jump led until the next."""
    for _ in range(3):
        soak.service.shift_clock(soak.random.choice([-864_000, -3600, -1, 1, 3600, 864_000, 0]))
        soak.wait(soak.random.random() * 2)


def permissions(soak):
    """Some folders can be neither listed nor entered for a while."""
    changed = []
    for folder, folders, _ in os.walk(soak.home + "/Documents"):
        for name in folders:
            if soak.random.random() < 0.1 and name not in ("edited", ".Trash"):
                changed.append(f"{folder}/{name}")
    handles = []
    for path in changed:
        try:
            handle = os.open(path, os.O_RDONLY | os.O_DIRECTORY | os.O_NOFOLLOW)
        except OSError:
            continue
        handles.append(handle)
        os.fchmod(handle, soak.random.choice([0, 0o100, 0o400, 0o500]))
    try:
        soak.wait(1 + soak.random.random() * 3)
    finally:
        for handle in handles:  # wherever it is by now
            os.fchmod(handle, 0o755)
            os.close(handle)


def silence(soak):
    """Stopped for a while, as a machine that sleeps."""
    soak.service.process.send_signal(signal.SIGSTOP)
    soak.wait(soak.random.random() * 3)
    soak.service.process.send_signal(signal.SIGCONT)


ALL = [kill, kill, end, burst, full_disk, clock_jumps, permissions, silence]
