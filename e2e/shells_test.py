"""Completion in the shells themselves, manual pages through their formatter, and the pager on a terminal."""

import os
import pathlib
import subprocess
import unittest

from harness import BIN, DeviceTest, on_screen

PAGES = pathlib.Path(os.environ.get("TBDAILY_PAGES", BIN.parent / "pages"))
# What has to be among the candidates behind these words, and what must not.
CASES = [
    ("", ["status", "report", "metrics"], ["complete", "--root"]),
    ("metr", ["metrics"], ["status"]),
    ("metrics ", ["list", "sample", "watch"], ["status"]),
    ("metrics sample --driver ", ["WirelessRadio"], ["list", "--group"]),
    ("--root {root} metrics sample --driver Wire", ["WirelessRadio"], []),
    ("metrics sample --dr", ["--driver"], ["--group"]),
    ("nand --explain Hott", ["HottestCycle"], []),
    ("nand Hott", ["HottestCycle"], []),
    ("report {root}/System/Device/cl", ["clock.plist"], []),
    ("group off ", ["Experiments", "Network"], []),
    ("buffer ", ["band-stats", "telemetry"], []),
    ("plist {root}/System/Device/cl", ["clock.plist"], []),
    ("record scalar k 3 --d", ["--day"], []),
    ("export --format ndjson --table h", ["histograms"], ["scalars"]),
    ("help sp", ["spool"], [])]

BASH = """source {script}
COMP_LINE="tallyctl $1"; read -ra COMP_WORDS <<< "$COMP_LINE"
[[ $COMP_LINE == *" " ]] && COMP_WORDS+=("")
COMP_CWORD=$((${{#COMP_WORDS[@]}} - 1))
compopt() {{ :; }}
_tallyctl
printf '%s\\n' "${{COMPREPLY[@]}}" """
ZSH = """fpath=({folder} $fpath); autoload -U compinit; compinit -u -D
compadd() {{ local -a names; while (( $# )); do case $1 in -a) names+=("${{(@P)2}}"); shift;; -*) ;; *) names+=("$1");; esac; shift; done
  print -rl -- $names; }}
_files() {{ print -rl -- ${{cur}}*; }}
autoload -U _tallyctl
words=(tallyctl ${{(z)1}}); [[ $1 == *" " || -z $1 ]] && words+=(""); CURRENT=$#words
_tallyctl | while read -r word; do [[ ${{word:t}} == ${{words[CURRENT]:t}}* ]] && print -r -- $word; done; true"""
FISH = "source {script}; complete -C \"tallyctl $argv[1]\" | cut -f1"


class Shells(DeviceTest):
    def setUp(self):
        self.sample = self.device(sample=True)
        self.sample.env.update(PATH=f"{BIN}:{os.environ['PATH']}", HOME=str(self.sample.base))

    def hold(self, command):
        for words, wanted, unwanted in CASES:
            words = words.format(root=self.sample.root)
            done = subprocess.run([*command, words], env=self.sample.env, capture_output=True, text=True, timeout=60)
            found = {pathlib.PurePath(line).name for line in done.stdout.splitlines()}
            self.assertTrue(found.issuperset(wanted), (words, wanted, done))
            self.assertFalse(found & set(unwanted), (words, done))

    def test_bash(self):
        self.hold(["bash", "--norc", "-c", BASH.format(script=PAGES / "bash/tallyctl"), "bash"])

    def test_zsh(self):
        self.hold(["zsh", "-f", "-c", ZSH.format(folder=PAGES / "zsh"), "zsh"])

    def test_fish(self):
        self.hold(["fish", "--no-config", "-c", FISH.format(script=PAGES / "fish/tallyctl.fish"), "--"])

    def test_manual_pages(self):
        pages = sorted((PAGES / "man").iterdir())
        self.assertIn("tallyctl-metrics.1", [page.name for page in pages])
        for page in pages:
            done = subprocess.run(["man", "--warnings", "-E", "UTF-8", "-l", "-Tutf8", "-Z", page], capture_output=True,
                                  env=dict(os.environ, MANWIDTH="80", LC_ALL="C.UTF-8"))
            self.assertEqual((done.returncode, done.stderr), (0, b""), page)
            self.assertTrue(done.stdout, page)

    def test_what_is_longer_than_the_screen_goes_to_the_pager(self):
        for words, pager, is_paged in ((["nand"], "sed s/^/PAGED/", True), (["nand", "--no-pager"], "sed s/^/PAGED/", False),
                                       (["consent", "show"], "sed s/^/PAGED/", False), (["nand"], "no-such-pager", False)):
            text = on_screen(self.sample, words, 80, lines=24, PAGER=pager)
            self.assertEqual("PAGED" in text, is_paged, (words, text[:200]))
            self.assertTrue(text)


if __name__ == "__main__":
    unittest.main()
