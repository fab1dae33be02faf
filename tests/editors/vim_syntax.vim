" The colours of class definition source lines in Vim's own syntax engine,
" with the syntax file of editors/vim:
"   vim -es -u NONE -i NONE -N -S tests/editors/vim_syntax.vim
" Exits with status 1 and one line per wrong colour, 0 when all are right.
let s:root = fnamemodify(expand('<sfile>:p'), ':h:h:h')
execute 'set runtimepath^=' . fnameescape(s:root . '/editors/vim')

" Each case: a line, the text in it to look at, and the syntax group every
" character of that text must be in ('' for none, or a group that merely
" holds others, such as the value of a statement).
let s:cases = [
      \ ['    DefaultValue=-1', '-1', 'qecfgNumber'],
      \ ['    DefaultValue=-40.0', '-40.0', 'qecfgNumber'],
      \ ['    Range=-5,-1e-40', '-1e-40', 'qecfgNumber'],
      \ ['    Name=Disk-1', '-', ''],
      \ ['    FileVersion=2.1.0.0', '2.1.0.0', 'qecfgNumber'],
      \ ['    Name=State', 'State', ''],
      \ ['    VariableClass=State', 'State', ''],
      \ ['    Description=Int32', 'Int32', ''],
      \ ['    VariableType=State', 'State', 'qecfgWord'],
      \ ['    DataType=UInt32', 'UInt32', 'qecfgWord'],
      \ ['    Properties=HasResources,CanDefine', 'CanDefine', 'qecfgWord'],
      \ ['    DataType=UInt32 # the size', '# the size', 'qecfgComment'],
      \ ['    DataType=Int32', 'DataType', 'qecfgWordKey'],
      \ ['ResourceClass # the class', 'ResourceClass', 'qecfgStanza'],
      \ ['ResourceClass # the class', '# the class', 'qecfgComment'],
      \ ]

call setline(1, map(copy(s:cases), 'v:val[0]'))
syntax on
set filetype=qecfg

let s:failures = []
for s:i in range(len(s:cases))
  let [s:line, s:part, s:want] = s:cases[s:i]
  let s:start = stridx(s:line, s:part)
  for s:col in range(s:start + 1, s:start + len(s:part))
    let s:got = synIDattr(synID(s:i + 1, s:col, 1), 'name')
    let s:got = s:got ==# 'qecfgWordValue' ? '' : s:got
    if s:got !=# s:want
      call add(s:failures, printf('%s: column %d (%s) is %s, not %s', s:line, s:col, s:line[s:col - 1],
            \ s:got ==# '' ? 'plain' : s:got, s:want ==# '' ? 'plain' : s:want))
      break
    endif
  endfor
endfor
if empty(s:failures)
  qall!
endif
call writefile(s:failures, '/dev/stderr')
cquit!
