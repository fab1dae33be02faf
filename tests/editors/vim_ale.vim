" ALE, the Vim plugin, starts qecfg-lsp through the shipped configuration
" (editors/vim: file type detection and ale_linters/qecfg/qecfg_lsp.vim) and
" shows what the server finds: diagnostics on open, after edits and after a
" change of settings, a hover, a definition jump and a completion list.
"   QECFG_LSP=path/to/qecfg-lsp vim -N -u NONE -i NONE -n -es -S tests/editors/vim_ale.vim
" Exits 0 when all hold, 1 with one line per failure on standard error, 77
" when ALE is not installed (Debian package vim-ale).
let s:root = fnamemodify(expand('<sfile>:p'), ':h:h:h')
let s:failures = []

function! s:Finish() abort
  if empty(s:failures)
    qall!
  endif
  call writefile(s:failures, '/dev/stderr')
  cquit!
endfunction

function! s:Check(cond, what) abort
  if !a:cond
    call add(s:failures, a:what)
  endif
endfunction

" Lets Vim run ALE's jobs and timers until cond (an expression) holds or ten
" seconds pass.
function! s:WaitFor(what, cond) abort
  let l:start = reltime()
  while !eval(a:cond)
    if reltimefloat(reltime(l:start)) > 10.0
      call add(s:failures, 'timed out waiting for ' . a:what)
      return 0
    endif
    sleep 20m
  endwhile
  return 1
endfunction

" The problems ALE holds for the current buffer, as 'line type code'.
function! s:Problems() abort
  return map(copy(ale#engine#GetLoclist(bufnr(''))),
        \ {_, p -> printf('%d %s %s', p.lnum, p.type, get(p, 'code', ''))})
endfunction

execute 'set runtimepath^=' . fnameescape(s:root . '/editors/vim')
silent! packadd ale
if !exists('g:loaded_ale')
  call writefile(['skipped: ALE is not installed (Debian package vim-ale)'], '/dev/stdout')
  77cquit!
endif
let $PATH = fnamemodify($QECFG_LSP, ':p:h') . ':' . $PATH
filetype plugin on
" Each step asks for a check with :ALELint, so no check on a timer overlaps.
let g:ale_lint_on_text_changed = 'never'
let g:ale_hover_to_preview = 1

let s:source = [
      \ 'ControlDefinition', "\tFileVersion=1.0.0.0", 'ResourceClass', "\tDescription=1", "\tDisplayName=2",
      \ "\tProperties=HasResources", "\tClassPermTemplate=t", "\tResourcePermTemplate=t", "\tName=Demo.Thing",
      \ 'DynamicResourceAttribute', "\tName=Load", "\tDescription=5", "\tDisplayName=6", "\tId=2",
      \ "\tDataType=Float64", "\tVariableType=Quantity", "\tVarietyRange=1,1", "\tVariableClass=Nope",
      \ 'ClassToManagerMapping', "\tResourceManager=Demo.RM", "\tFirstKey=1", "\tLastKey=10",
      \ "\tMessageCatalog=demo.cat", "\tDescriptiveMessageSet=1", 'ResourceVariableClass',
      \ "\tObservationInterval=60", "\tReportingInterval=60", "\tVariableClass=VC1",
      \ ]
" 1-based line numbers of the source
let s:DATATYPE = 15
let s:VARCLASS_USE = 18
let s:VARCLASS_DEF = 28

let s:path = tempname() . '.src'
call writefile(s:source, s:path)
execute 'edit ' . fnameescape(s:path)
call s:Check(&filetype ==# 'qecfg', 'the file type is qecfg, not ' . &filetype)
call s:Check(index(map(ale#linter#Get('qecfg'), 'v:val.name'), 'qecfg-lsp') >= 0, 'ALE knows the linter qecfg-lsp')

" On open: the unknown variable class, a warning on its line.
ALELint
let s:warned = [s:VARCLASS_USE . ' W variable-class']
if s:WaitFor('the first diagnostics', '!empty(s:Problems())')
  call s:Check(s:Problems() ==# s:warned, 'on open: ' . string(s:Problems()))
endif

" Settings reach the running server: the warning switched off, then on.
let b:ale_qecfg_lsp_config = {'warnings': {'variable-class': v:false}}
ALELint
call s:WaitFor('the warning switched off', 'empty(s:Problems())')
let b:ale_qecfg_lsp_config = {'warnings': {'variable-class': v:true}}
ALELint
call s:WaitFor('the warning switched on', 's:Problems() ==# s:warned')

" Edits: one that mends the variable class clears it, one that misspells a
" data type is an error naming it.
call setline(s:VARCLASS_USE, "\tVariableClass=VC1")
ALELint
call s:WaitFor('the diagnostics to clear', 'empty(s:Problems())')
call setline(s:DATATYPE, "\tDataType=Uint32")
ALELint
if s:WaitFor('an error', 's:Problems() ==# [s:DATATYPE . " E "]')
  let s:error = ale#engine#GetLoclist(bufnr(''))[0]
  call s:Check(s:error.text =~# 'Uint32', 'the error names the data type: ' . s:error.text)
endif
call setline(s:DATATYPE, "\tDataType=Float64")

" A hover on the data type, shown in the preview window: the reference's
" list of data types.
call cursor(s:DATATYPE, 12)
ALEHover
if s:WaitFor('the hover', '!empty(filter(range(1, winnr("$")), "getwinvar(v:val, \"&previewwindow\")"))')
  wincmd P
  let s:hover = join(getline(1, '$'))
  wincmd p
  pclose
  call s:Check(s:hover =~# 'Float64' && s:hover =~# 'UInt32', 'the hover lists the data types: ' . s:hover)
endif

" Go to definition: from a use of the variable class to the stanza naming it.
call cursor(s:VARCLASS_USE, 17)
ALEGoToDefinition
call s:WaitFor('the definition jump', 'line(".") == s:VARCLASS_DEF')

" Completion through ALE's omni completion function, in insert mode after
" DataType=: the data type names and no keyword. (ALE's function waits for the server; the
" test's time limit ends a server that never answers.)
function! QecfgRecordCompletion(findstart, base) abort
  let l:result = ale#completion#OmniFunc(a:findstart, a:base)
  if !a:findstart
    let s:completions = map(copy(l:result), 'v:val.word')
  endif
  return l:result
endfunction
let s:completions = []
setlocal omnifunc=QecfgRecordCompletion
execute "normal! " . s:DATATYPE . "GS\tDataType=\<C-x>\<C-o>\<Esc>"
call s:Check(index(s:completions, 'Float64') >= 0 && index(s:completions, 'UInt32') >= 0
      \ && index(s:completions, 'Name') < 0,
      \ 'completion after DataType= offers the data types: ' . string(s:completions))
call s:Finish()
