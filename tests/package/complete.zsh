# complete.zsh FOLDER PROGRAM LINE...: prints what zsh makes of "PROGRAM LINE" and the tab key, with the completions
# of the folder. VESK_MOUNTS is the file "mounts" of the working folder.
zmodload zsh/zpty
folder=$1
program=$2
shift 2
for line in "$@"; do
    zpty shell "TERM=dumb VESK_MOUNTS=${(q)PWD}/mounts zsh -f -i"
    zpty -w shell "PS1=; bindkey -e; setopt no_zle_bracketed_paste 2>/dev/null; fpath=(${(qq)folder} \$fpath)"
    zpty -w shell "autoload -U compinit; compinit -u -D"
    # What the tab key does, and then the line is shown without a blank at its end, between words that stand
    # nowhere else.
    zpty -w shell "complete-and-show() { zle expand-or-complete; print -r -- beg''in\"<\${BUFFER% }>\"e''nd; }"
    zpty -w shell "zle -N complete-and-show; bindkey '^I' complete-and-show; print read''y"
    zpty -r -m shell answer '*ready*'
    zpty -w -n shell "$program $line"$'\t'
    zpty -r -m shell answer '*begin<*>end*'
    print -r -- "$answer"
    zpty -d shell
done
