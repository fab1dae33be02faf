" qecfg-lsp in Vim through ALE (Debian package vim-ale; `packadd! ale` in
" the vimrc). ALE loads this file for buffers of filetype qecfg when it sits
" in ~/.vim/ale_linters/qecfg/ beside ftdetect/qecfg.vim.
"
" g:ale_qecfg_lsp_executable  the server program (default: qecfg-lsp)
" g:ale_qecfg_lsp_config      settings, as qecfg-check -W and -o take them:
"                             {'warnings': {'locator': v:false},
"                              'outputName': 'disk.cdef'}
" Both may also be set per buffer (b:ale_qecfg_lsp_...); a changed config
" reaches the running server at the next check.

call ale#Set('qecfg_lsp_executable', 'qecfg-lsp')
call ale#Set('qecfg_lsp_config', {})

" The repository holding the source, or else its directory.
function! ale_linters#qecfg#qecfg_lsp#ProjectRoot(buffer) abort
    let l:git = ale#path#FindNearestDirectory(a:buffer, '.git')

    return empty(l:git) ? expand('#' . a:buffer . ':p:h') : fnamemodify(l:git, ':h:h')
endfunction

call ale#linter#Define('qecfg', {
\   'name': 'qecfg-lsp',
\   'lsp': 'stdio',
\   'executable': {b -> ale#Var(b, 'qecfg_lsp_executable')},
\   'command': '%e',
\   'project_root': function('ale_linters#qecfg#qecfg_lsp#ProjectRoot'),
\   'initialization_options': {b -> ale#Var(b, 'qecfg_lsp_config')},
\   'lsp_config': {b -> ale#Var(b, 'qecfg_lsp_config')},
\})
