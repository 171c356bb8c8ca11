#!/usr/bin/env python3
"""Builds the product's MSI with wixl.

The product version is read from the DLL's own version resource, so the installer cannot
disagree with the module it installs. The sample receivers are listed into a fragment at
build time, so a receiver added to the tree is installed without editing the .wxs.
"""
import argparse
import hashlib
import os
import shutil
import struct
import subprocess
import sys

# Action types as wixl writes an executable installed with the product, and what an entry of
# a DLL installed with the product is (the flags above the low six bits are kept).
EXE_FILE, DLL_FILE, SET_PROPERTY, SOURCE_TYPE_BITS = 18, 17, 51, 0x3F
IN_SCRIPT, ROLLBACK = 0x400, 0x100
DLL_ACTIONS = ("RegisterShellExtension", "UnregisterShellExtension", "RollBackShellExtension")
# wixl 0.101 writes Execute="rollback" without its in-script bits, which would make an
# immediate action of it: the removal would run during every install.
ROLLBACK_ACTIONS = ("RollBackShellExtension", "RollBackDeviceSim")


def file_version(path):
    """The FILEVERSION of a PE file's VS_FIXEDFILEINFO, as "a.b.c.d"."""
    data = open(path, "rb").read()
    at = data.find(struct.pack("<I", 0xFEEF04BD))
    if at < 0:
        sys.exit(f"{path}: no version resource")
    ms, ls = struct.unpack_from("<II", data, at + 8)
    return f"{ms >> 16}.{ms & 0xFFFF}.{ls >> 16}.{ls & 0xFFFF}"


def ident(prefix, text):
    return prefix + hashlib.sha1(text.encode("utf-8")).hexdigest()[:24]


def sample_fragment(samples):
    """A fragment installing every receiver folder under SAMPLESDIR, one component each."""
    lines = ['<?xml version="1.0" encoding="utf-8"?>',
             '<Wix xmlns="http://schemas.microsoft.com/wix/2006/wi"><Fragment>',
             '<DirectoryRef Id="SAMPLESDIR">']
    components = []
    for receiver in sorted(os.listdir(samples)):
        folder = os.path.join(samples, receiver)
        if not os.path.isdir(folder):
            continue
        names = sorted(n for n in os.listdir(folder) if os.path.isfile(os.path.join(folder, n)))
        # wixl and libmsi end with a crash on a file name outside ASCII: such files stay out.
        skipped = [n for n in names if not n.isascii()]
        for name in skipped:
            print(f"installer: {receiver}/{name} left out (wixl takes ASCII file names only)")
        names = [n for n in names if n.isascii()]
        if not names:
            continue
        component = ident("c", receiver)
        components.append(component)
        lines.append(f'<Directory Id="{ident("d", receiver)}" Name="{xml(receiver)}">')
        guid = hashlib.md5(("calvex-sample:" + receiver).encode("utf-8")).hexdigest().upper()
        guid = f"{guid[:8]}-{guid[8:12]}-{guid[12:16]}-{guid[16:20]}-{guid[20:]}"
        lines.append(f'<Component Id="{component}" Guid="{guid}" Win64="yes">')
        for i, name in enumerate(names):
            key = ' KeyPath="yes"' if i == 0 else ""
            source = xml(f"samples/{receiver}/{name}")
            lines.append(f'<File Id="{ident("f", receiver + "/" + name)}" Name="{xml(name)}" '
                         f'Source="{source}"{key}/>')
        lines.append('</Component></Directory>')
    lines.append('</DirectoryRef><ComponentGroup Id="SampleReceivers">')
    lines += [f'<ComponentRef Id="{c}"/>' for c in components]
    lines.append('</ComponentGroup></Fragment></Wix>')
    return "\n".join(lines) + "\n"


def xml(text):
    return text.replace("&", "&amp;").replace('"', "&quot;").replace("<", "&lt;").replace(">", "&gt;")


def stage(work, dll, sim, fetch, fetchw, samples):
    """wixl reads sources by relative path: link the inputs into one directory."""
    if os.path.isdir(work):
        shutil.rmtree(work)
    os.makedirs(work)
    inputs = (("CalvexReceiversShellExt.dll", dll), ("CalvexDeviceSim.exe", sim), ("calvex-fetch.exe", fetch),
              ("calvex-fetchw.exe", fetchw), ("samples", samples))
    for name, target in inputs:
        os.symlink(os.path.abspath(target), os.path.join(work, name))


def fix_actions(msi):
    """Turns the module's actions into calls of the DLL's entries and makes rollback actions
    roll back; every action that changes the system must end up in the install script
    (deferred). Setting a property (a default) happens at once."""
    table = subprocess.run(["msiinfo", "export", msi, "CustomAction"], check=True,
                           capture_output=True, text=True).stdout.splitlines()
    for row in table[3:]:
        action, written = row.split("\t")[:2]
        kind = int(written)
        if action in DLL_ACTIONS:
            if kind & SOURCE_TYPE_BITS != EXE_FILE:
                sys.exit(f"{action}: unexpected action type {kind}")
            kind = (kind & ~SOURCE_TYPE_BITS) | DLL_FILE
        if action in ROLLBACK_ACTIONS:
            kind |= IN_SCRIPT | ROLLBACK
        if not kind & IN_SCRIPT and kind & SOURCE_TYPE_BITS != SET_PROPERTY:
            sys.exit(f"{action}: not a deferred action ({kind})")
        if kind != int(written):
            subprocess.run(["msibuild", msi, "-q",
                            f"UPDATE `CustomAction` SET `Type` = {kind} WHERE `Action` = '{action}'"], check=True)


def main():
    p = argparse.ArgumentParser()
    for a in ("wxs", "dll", "sim", "fetch", "fetchw", "samples", "work", "out"):
        p.add_argument("--" + a, required=True)
    # The same package as the next version (Windows Installer compares the first three fields),
    # to try an upgrade over this one.
    p.add_argument("--next", action="store_true")
    args = p.parse_args()
    version = file_version(args.dll)
    if args.next:
        fields = [int(f) for f in version.split(".")]
        version = f"{fields[0]}.{fields[1]}.{fields[2] + 1}.{fields[3]}"
    stage(args.work, args.dll, args.sim, args.fetch, args.fetchw, args.samples)
    with open(os.path.join(args.work, "samples.wxs"), "w", encoding="utf-8") as f:
        f.write(sample_fragment(args.samples))
    shutil.copy(args.wxs, os.path.join(args.work, "product.wxs"))
    out = os.path.abspath(args.out)
    os.makedirs(os.path.dirname(out), exist_ok=True)
    subprocess.run(["wixl", "-a", "x64", "-D", f"Version={version}", "-o", out, "product.wxs", "samples.wxs"],
                   cwd=args.work, check=True)
    fix_actions(out)
    print(f"installer: {out} version {version}")


if __name__ == "__main__":
    main()
