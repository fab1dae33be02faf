-- Neovim's own LSP client, started by the shipped configuration
-- (editors/nvim/qecfg-lsp.lua, with the Vim file type detection), against
-- qecfg-lsp: diagnostics (also after edits), hover, completion, a definition
-- jump, document symbols, a code action applied and a formatting edit. Run
-- headless; the exit status tells.
--   QECFG_LSP=path/to/qecfg-lsp QECFG_SOURCE_DIR=repo QECFG_LSP_WORK=dir \
--     nvim --headless --clean -c 'luafile client_test.lua'
local server = assert(os.getenv('QECFG_LSP'), 'QECFG_LSP not set')
local repo = assert(os.getenv('QECFG_SOURCE_DIR'), 'QECFG_SOURCE_DIR not set')
local work = assert(os.getenv('QECFG_LSP_WORK'), 'QECFG_LSP_WORK not set')
local failures = {}

local function check(cond, what)
  if not cond then
    table.insert(failures, what)
  end
end

local source = {
  'ControlDefinition', '\tFileVersion=1.0.0.0', 'ResourceClass', '\tDescription=1', '\tDisplayName=2',
  '\tProperties=HasResources', '\tClassPermTemplate=t', '\tResourcePermTemplate=t', '\tName=Demo.Thing',
  'PersistentResourceAttribute', '\tName=Size', '\tDescription=3', '\tDisplayName=4', '\tId=1',
  '\tDataType=UInt32', '\tVarietyRange=1,1', 'DynamicResourceAttribute', '\tName=Load', '\tDescription=5',
  '\tDisplayName=6', '\tId=2', '\tDataType=Float64', '\tVariableType=Quantity', '\tVarietyRange=1,1',
  '\tVariableClass=Nope', 'ClassToManagerMapping', '\tResourceManager=Demo.RM', '\tFirstKey=1', '\tLastKey=10',
  '\tMessageCatalog=demo.cat', '\tDescriptiveMessageSet=1', 'ResourceVariableClass', '\tObservationInterval=60',
  '\tReportingInterval=60', '\tVariableClass=VC1',
}
-- 0-based line numbers of the source
local DATATYPE, VARCLASS_USE, VARCLASS_DEF, DESCRIPTION = 14, 24, 34, 11

local function run()
  local path = work .. '/demo.src'
  vim.fn.writefile(source, path)
  vim.env.PATH = vim.fn.fnamemodify(server, ':p:h') .. ':' .. vim.env.PATH
  vim.cmd('source ' .. repo .. '/editors/vim/ftdetect/qecfg.vim')
  vim.cmd('luafile ' .. repo .. '/editors/nvim/qecfg-lsp.lua')
  vim.cmd('edit ' .. path)
  local buf = vim.api.nvim_get_current_buf()
  check(vim.bo[buf].filetype == 'qecfg', 'the file type is detected')
  local client
  vim.wait(5000, function()
    client = (vim.lsp.buf_get_clients(buf)[1] or {}).id
    return client ~= nil
  end, 20)
  assert(client, 'the configuration started no client')

  local function diagnostics() return vim.diagnostic.get(buf) end
  local function wait_for(what, cond)
    check(vim.wait(10000, cond, 20), 'timed out waiting for ' .. what)
  end
  local function request(method, params)
    local answers = vim.lsp.buf_request_sync(buf, method, params, 5000) or {}
    return answers[client] and answers[client].result
  end
  local function at(line, character)
    return { textDocument = vim.lsp.util.make_text_document_params(buf), position = { line = line, character = character } }
  end
  local function set_line(line, text) vim.api.nvim_buf_set_lines(buf, line, line + 1, false, { text }) end
  local function line_text(line) return vim.api.nvim_buf_get_lines(buf, line, line + 1, false)[1] end

  -- Diagnostics on open: the unknown variable class, on its line.
  wait_for('the first diagnostics', function() return #diagnostics() > 0 end)
  local d = diagnostics()[1]
  check(d and d.lnum == VARCLASS_USE and d.code == 'variable-class' and d.severity == vim.diagnostic.severity.WARN,
        'warning on the VariableClass line: ' .. vim.inspect(d))

  -- After an edit that mends it, none; after one that breaks a keyword, an error.
  set_line(VARCLASS_USE, '\tVariableClass=VC1')
  wait_for('the diagnostics to clear', function() return #diagnostics() == 0 end)
  set_line(DATATYPE, '\tDataType=Uint32')
  wait_for('an error', function()
    local e = diagnostics()[1]
    return e and e.lnum == DATATYPE and e.severity == vim.diagnostic.severity.ERROR
  end)

  -- A code action applied: the suggestion replaces the misspelt type.
  local actions = request('textDocument/codeAction', {
    textDocument = vim.lsp.util.make_text_document_params(buf),
    range = { start = { line = DATATYPE, character = 0 }, ['end'] = { line = DATATYPE, character = 0 } },
    context = { diagnostics = vim.lsp.diagnostic.get_line_diagnostics(buf, DATATYPE) },
  }) or {}
  local replace
  for _, a in ipairs(actions) do
    if a.title:find('^Replace') then replace = a end
  end
  check(replace ~= nil, 'a Replace action: ' .. vim.inspect(actions))
  if replace then
    vim.lsp.util.apply_workspace_edit(replace.edit, 'utf-16')
    check(line_text(DATATYPE) == '\tDataType=UInt32', 'the action mended the line: ' .. line_text(DATATYPE))
    wait_for('the error to clear', function() return #diagnostics() == 0 end)
  end

  -- Hover on a keyword: its row of the reference.
  local hover = request('textDocument/hover', at(DATATYPE, 3))
  check(hover and hover.contents.value:find('| `DataType` | required | no | data type name |', 1, true),
        'hover on DataType: ' .. vim.inspect(hover))

  -- Completion after DataType=: the type names.
  local completion = request('textDocument/completion', at(DATATYPE, 10))
  local labels = {}
  for _, item in ipairs(completion and completion.items or {}) do labels[item.label] = true end
  check(labels['UInt32'] and labels['StringArray'], 'completion of type names: ' .. vim.inspect(completion))

  -- Definition: the jump lands on the ResourceVariableClass that defines VC1.
  vim.api.nvim_win_set_cursor(0, { VARCLASS_USE + 1, 16 })
  vim.lsp.buf.definition()
  wait_for('the definition jump', function() return vim.api.nvim_win_get_cursor(0)[1] == VARCLASS_DEF + 1 end)

  -- Document symbols: the class, the map and the variable class.
  local symbols = request('textDocument/documentSymbol', { textDocument = vim.lsp.util.make_text_document_params(buf) })
  local names = {}
  for _, s in ipairs(symbols or {}) do table.insert(names, s.name) end
  check(table.concat(names, ',') == 'Demo.Thing,Demo.RM,VC1', 'document symbols: ' .. table.concat(names, ','))
  check(symbols and symbols[1].children and symbols[1].children[1].name == 'Size', 'attributes nest in their class')

  -- Formatting: the indentation and trailing blanks of a statement.
  set_line(DESCRIPTION, '    Description=3   ')
  local edits = request('textDocument/formatting', {
    textDocument = vim.lsp.util.make_text_document_params(buf), options = { tabSize = 4, insertSpaces = true },
  })
  vim.lsp.util.apply_text_edits(edits or {}, buf, 'utf-16')
  check(line_text(DESCRIPTION) == '\tDescription=3', 'formatted line: ' .. vim.inspect(line_text(DESCRIPTION)))

  vim.lsp.stop_client(client)
end

local ok, err = pcall(run)
if not ok then
  table.insert(failures, 'error: ' .. tostring(err))
end
for _, f in ipairs(failures) do
  io.stderr:write('FAIL: ' .. f .. '\n')
end
if #failures > 0 then
  vim.cmd('cquit 1')
end
io.stdout:write('neovim client: all checks passed\n')
vim.cmd('qall!')
