-- qecfg-lsp in Neovim's built-in client (Neovim 0.7 or later). Put this file
-- in ~/.config/nvim/plugin/ (with editors/vim/ftdetect/qecfg.vim and
-- editors/vim/syntax/qecfg.vim under ~/.config/nvim/), or :luafile it.
-- Settings follow qecfg-check -W: warnings = { locator = false, ... }.
local settings = { warnings = vim.empty_dict(), outputName = '' }

local function root_of(path)
  local found = vim.fn.finddir('.git', vim.fn.fnamemodify(path, ':p:h') .. ';')
  return found ~= '' and vim.fn.fnamemodify(found, ':p:h:h') or vim.fn.fnamemodify(path, ':p:h')
end

vim.api.nvim_create_autocmd('FileType', {
  pattern = 'qecfg',
  callback = function(args)
    local config = {
      name = 'qecfg-lsp',
      cmd = { 'qecfg-lsp' },
      root_dir = root_of(vim.api.nvim_buf_get_name(args.buf)),
      init_options = settings,
    }
    if vim.lsp.start then -- Neovim 0.8 and later reuse a running client
      vim.lsp.start(config, { bufnr = args.buf })
    else
      vim.lsp.buf_attach_client(args.buf, vim.lsp.start_client(config))
    end
  end,
})
