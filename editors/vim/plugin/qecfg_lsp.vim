" qecfg-lsp in Vim with the vim-lsp plugin (prabirshrestha/vim-lsp). Copy
" into ~/.vim/plugin/ beside ftdetect/qecfg.vim and syntax/qecfg.vim.
" Settings follow qecfg-check -W: {'warnings': {'locator': v:false}}.
if exists('g:loaded_qecfg_lsp') || !executable('qecfg-lsp')
  finish
endif
let g:loaded_qecfg_lsp = 1

augroup qecfg_lsp
  autocmd!
  autocmd User lsp_setup call lsp#register_server({
        \ 'name': 'qecfg-lsp',
        \ 'cmd': {server_info -> ['qecfg-lsp']},
        \ 'allowlist': ['qecfg'],
        \ 'initialization_options': get(g:, 'qecfg_lsp_settings', {'warnings': {}}),
        \ })
augroup END
