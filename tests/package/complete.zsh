# complete.zsh FOLDER LINE...: prints what zsh makes of "veskcachepinfiletool LINE" and the tab key, with the
# completions of the folder. VESK_MOUNTS is the file "mounts" of the working folder.
zmodload zsh/zpty
folder=$1
shift
for line in "$@"; do
    zpty shell "TERM=dumb VESK_MOUNTS=$PWD/mounts zsh -f -i"
    zpty -w shell "PS1=; bindkey -e; setopt no_zle_bracketed_paste 2>/dev/null; fpath=($folder \$fpath)"
    zpty -w shell "autoload -U compinit; compinit -u -D; print read''y"
    zpty -r -m shell answer '*ready*'
    # The completed line is turned into one that prints itself.
    zpty -w -n shell "veskcachepinfiletool $line"$'\t'
    sleep 2
    zpty -w -n shell $'\C-aprint -r -- "<\C-e>"\n'
    zpty -r -m shell answer '*<*>*'
    sleep 0.2
    while zpty -r -t shell more; do answer+=$more; done
    print -r -- "$answer"
    zpty -d shell
done
