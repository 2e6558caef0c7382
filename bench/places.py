"""The folders that contenders write into: in memory, on the disk of the workload, and on a file
system whose copies share extents."""

import os
import shutil
import subprocess
import tempfile
from pathlib import Path

MEMORY = Path("/dev/shm")
IMAGE_SIZE = 2 << 30


def file_system_of(path):
    """The type of the file system that the path lies on."""
    best = (-1, "unknown")
    for line in Path("/proc/self/mountinfo").read_text().splitlines():
        mount, _, kind = line.partition(" - ")
        place = Path(mount.split()[4].replace("\\040", " "))
        if Path(path).resolve().is_relative_to(place):
            # Of two at one place the later one covers the other.
            found = (len(place.parts), kind.split()[0])
            best = found if found[0] >= best[0] else best
    return best[1]


class Places:
    """Its folders go with it."""

    def __init__(self, workload):
        self.folders, self.skipped, self.brought = {}, {}, {}
        self.number = 0
        self.image, self.mounted = workload / "shared-extents.img", None
        self.folders["disk"] = Path(tempfile.mkdtemp(prefix="out-", dir=workload))
        if file_system_of(MEMORY) == "tmpfs" and os.access(MEMORY, os.W_OK):
            self.folders["memory"] = Path(tempfile.mkdtemp(prefix="parvel-bench-", dir=MEMORY))
        else:
            self.skipped["memory"] = "there is no memory file system"

    def __enter__(self):
        return self

    def __exit__(self, *_):
        if self.mounted:
            subprocess.run(["umount", self.mounted], check=False)
        self.image.unlink(missing_ok=True)
        for folder in self.folders.values():
            shutil.rmtree(folder, ignore_errors=True)

    def why_not(self, place):
        """None where the place is there."""
        if place == "shared" and place not in self.folders and place not in self.skipped:
            self.mount_shared()
        return self.skipped.get(place)

    def mount_shared(self):
        self.skipped["shared"] = "mounting a file system that shares extents needs root"
        if os.geteuid() != 0:
            return
        folder = Path(tempfile.mkdtemp(prefix="shared-", dir=self.image.parent))
        self.folders["shared"] = folder
        quiet = {"stdout": subprocess.DEVNULL, "stderr": subprocess.DEVNULL, "check": False}
        for maker in (["mkfs.btrfs", "-q", "-f"], ["mkfs.xfs", "-q", "-f"]):
            if shutil.which(maker[0]) is None:
                continue
            with open(self.image, "wb") as image:
                image.truncate(IMAGE_SIZE)
            if subprocess.run([*maker, self.image], **quiet).returncode == 0 and \
                    subprocess.run(["mount", "-o", "loop", self.image, folder],
                                   **quiet).returncode == 0:
                self.mounted = folder
                del self.skipped["shared"]
                return
        self.skipped["shared"] = "no file system that shares extents can be made here"

    def new_folder(self, place):
        self.number += 1
        folder = self.folders[place] / str(self.number)
        folder.mkdir()
        return folder

    def drop(self, place, folder):
        shutil.rmtree(folder)
        if place != "memory":
            os.sync()

    def clear(self, place):
        for folder in self.folders[place].iterdir():
            shutil.rmtree(folder)
        self.brought.pop(place, None)

    def bring(self, place, paths):
        """Copies of the files in the place, made once, with their attributes."""
        if place not in self.brought:
            folder = self.new_folder(place)
            subprocess.run(["cp", "--preserve=xattr", *paths, folder], check=True)
            self.brought[place] = [str(folder / Path(path).name) for path in paths]
            os.sync()
        return self.brought[place]
