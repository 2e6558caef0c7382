"""Asks real shells what they would complete a command line to.

bash and zsh are run at a terminal of their own and are given the keys that a person would press;
fish tells without one. Each shell is made of an environment that has PATH, HOME and COMPLETIONS, the
folder of the completions.
"""

import itertools
import os
import pty
import select
import shlex
import subprocess

TIMEOUT = 30  # seconds for one answer; far beyond what any takes
END = "\x01"  # behind each answer

# M-* puts all completions on the line, and C-x 1 tells what then stands there.
BASH_START = f"""
source "$COMPLETIONS/parvel.bash"
tell() {{ printf '%s{END}' "$READLINE_LINE" >&"$ANSWERS"; READLINE_LINE=; }}
bind -x '"\\C-x1": tell'
bind 'set bell-style none'
HISTFILE= PS1='' PROMPT_COMMAND=
"""
# Every match passes through compadd; what it says it has matched is told.
ZSH_START = f"""
fpath=("$COMPLETIONS" $fpath)
autoload -Uz compinit
compinit -u -d "$HOME/dump"
unsetopt zle_bracketed_paste
compadd() {{
    if [[ ${{@[1,(i)(-|--)]}} == *-[OADE]\\ * ]]; then
        builtin compadd "$@"
        return
    fi
    local -a matched
    builtin compadd -A matched "$@"
    (( $#matched )) && print -rl -u $ANSWERS -- $matched
    builtin compadd "$@"
}}
tell() {{
    zle complete-word
    printf '{END}' >&$ANSWERS
    BUFFER=
}}
zle -N tell
bindkey '^X1' tell
zstyle ':completion:*' force-list never
PS1=
"""
FISH_START = f"""
set fish_complete_path $COMPLETIONS
while read --local line
    complete --do-complete=$line
    echo '{END}'
end
"""


class Terminal:
    """An interactive shell whose start-up file is `start`; it answers through a pipe."""

    def __init__(self, words, start_name, start, environment):
        home = environment["HOME"]
        with open(os.path.join(home, start_name), "w") as file:
            file.write(start)
        self._answers, theirs = os.pipe()
        self._process, self._terminal = pty.fork()
        if self._process == 0:
            os.set_inheritable(theirs, True)
            os.execvpe(words[0], words, environment | {
                "ZDOTDIR": home, "TERM": "dumb", "INPUTRC": "/dev/null", "ANSWERS": str(theirs)})
        os.close(theirs)

    def answer(self, keys):
        os.write(self._terminal, keys.encode())
        told = b""
        while not told.endswith(END.encode()):
            ready, _, _ = select.select([self._answers, self._terminal], [], [], TIMEOUT)
            if not ready:
                raise TimeoutError(f"no answer to {keys!r}")
            if self._terminal in ready:
                os.read(self._terminal, 4096)  # what a person would see
            if self._answers in ready:
                told += os.read(self._answers, 4096)
        return told.decode()[:-len(END)]

    def end(self):
        os.close(self._terminal)  # hangs up
        os.close(self._answers)
        os.waitpid(self._process, 0)


class Bash(Terminal):
    def __init__(self, environment):
        rc_file = environment["HOME"] + "/.bashrc"
        super().__init__(["bash", "--noprofile", "--rcfile", rc_file, "-i"], ".bashrc", BASH_START,
                         environment)

    def offers(self, line):
        """What stands in the place of the last word; that word alone if nothing is offered."""
        typed = line.rpartition(" ")[0]
        told = self.answer(line + "\x1b*\x181")
        if told == line:
            return set()
        return {word.rpartition("=")[2].rstrip("/") for word in shlex.split(told[len(typed):])}


class Zsh(Terminal):
    def __init__(self, environment):
        super().__init__(["zsh", "-d", "-i"], ".zshrc", ZSH_START, environment)

    def offers(self, line):
        told = self.answer(line + "\x181")
        return {word.replace("\\", "").rstrip("/") for word in told.split("\n") if word}


class Fish:
    def __init__(self, environment):
        self._process = subprocess.Popen(["fish", "--no-config", "-c", FISH_START], text=True,
                                         env=environment, stdin=subprocess.PIPE,
                                         stdout=subprocess.PIPE)

    def offers(self, line):
        self._process.stdin.write(line + "\n")
        self._process.stdin.flush()
        told = iter(self._process.stdout.readline, "")
        words = [each.split("\t")[0].rstrip("\n") for each in itertools.takewhile(
            lambda each: each != END + "\n", told)]
        return {word.rpartition("=")[2].rstrip("/") for word in words}

    def end(self):
        self._process.communicate()


SHELLS = {"bash": Bash, "zsh": Zsh, "fish": Fish}
