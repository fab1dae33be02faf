" Class definition sources: *.cdefsrc, and *.src files that start a class.
au BufRead,BufNewFile *.cdefsrc setfiletype qecfg
au BufRead,BufNewFile *.src if join(getline(1, 200), "\n") =~# '\(^\|\n\)ControlDefinition[ \t]*\(\n\|$\)' | set filetype=qecfg | endif
