// The VS Code extension outside VS Code: its manifest against the client it
// depends on, and its client code loaded in Node with a stand-in for the
// `vscode` module (vscode_standin.js), so that activation starts the real
// qecfg-lsp through vscode-languageclient. The test then acts as the user:
// opens and edits a source, changes settings, and asks the providers the
// client registered for a hover, completion, a definition, the outline, a
// quick fix and formatting. Exits with status 1 and one line per failure.
//   QECFG_LSP=path/to/qecfg-lsp node tests/editors/vscode_extension.test.js
'use strict';
const childProcess = require('child_process');
const fs = require('fs');
const Module = require('module');
const os = require('os');
const path = require('path');
const { createVscode } = require('./vscode_standin');

const extensionDir = path.resolve(__dirname, '..', '..', 'editors', 'vscode');
const manifest = JSON.parse(fs.readFileSync(path.join(extensionDir, 'package.json'), 'utf8'));
const server = process.env.QECFG_LSP;
const TIMEOUT_MS = 10000;

let semver, clientManifest;
try {
  semver = require('semver');
  const clientMain = require.resolve('vscode-languageclient/node');
  clientManifest = JSON.parse(fs.readFileSync(path.join(clientMain, '..', '..', '..', 'package.json'), 'utf8'));
} catch (e) {
  console.error(`${e.message}\nInstall the client first: npm ci --prefix tests/editors`);
  process.exit(1);
}
if (!server) {
  console.error('QECFG_LSP (the qecfg-lsp program) is not set');
  process.exit(1);
}

const failures = [];
function expect(ok, what) {
  if (!ok) failures.push(what);
}

// The settings the client code reads, each contributed with its default.
const SETTINGS = ['qecfg.server.path', 'qecfg.warnings', 'qecfg.outputName'];

function checkManifest() {
  expect(fs.existsSync(path.resolve(extensionDir, manifest.main)), `main ${manifest.main} is no file`);
  expect((manifest.activationEvents || []).includes('onLanguage:qecfg'),
    'the extension is not activated by qecfg sources');
  const wanted = (manifest.dependencies || {})['vscode-languageclient'];
  expect(wanted && semver.satisfies(clientManifest.version, wanted),
    `the tested vscode-languageclient ${clientManifest.version} is not the ${wanted} the extension depends on`);
  expect(semver.subset(manifest.engines.vscode, clientManifest.engines.vscode),
    `the extension claims VS Code ${manifest.engines.vscode}; its client needs ${clientManifest.engines.vscode}`);
  const properties = manifest.contributes.configuration.properties;
  for (const name of SETTINGS)
    expect(properties[name] && 'default' in properties[name], `the setting ${name} is not contributed with a default`);
}

// `require('vscode')` gives the stand-in, and the extension's
// `require('vscode-languageclient/...')` the one installed for the tests
// (the extension folder has no node_modules of its own here).
function hookModules(api) {
  const load = Module._load;
  Module._load = function (request, ...rest) {
    if (request === 'vscode') return api;
    if (request.startsWith('vscode-languageclient')) request = require.resolve(request);
    return load.call(this, request, ...rest);
  };
}

// The processes the client starts.
function recordSpawns() {
  const spawned = [];
  const spawn = childProcess.spawn;
  childProcess.spawn = function (command, args, options) {
    const child = spawn.call(this, command, args, options);
    const record = { command, args, exited: new Promise((resolve) => child.on('exit', (code) => resolve(code))) };
    spawned.push(record);
    return child;
  };
  return spawned;
}

function withTimeout(promise, what) {
  let timer;
  const timeout = new Promise((_, reject) => {
    timer = setTimeout(() => reject(new Error(`timed out: ${what}`)), TIMEOUT_MS);
  });
  return Promise.race([promise, timeout]).finally(() => clearTimeout(timer));
}

const SOURCE = [
  'ControlDefinition', '\tFileVersion=1.0.0.0', 'ResourceClass', '\tDescription=1', '\tDisplayName=2',
  '\tProperties=HasResources', '\tClassPermTemplate=t', '\tResourcePermTemplate=t', '\tName=Demo.Thing',
  'DynamicResourceAttribute', '\tName=Load', '\tDescription=5', '\tDisplayName=6', '\tId=2',
  '\tDataType=Float64', '\tVariableType=Quantity', '\tVarietyRange=1,1', '\tVariableClass=Nope',
  'ClassToManagerMapping', '\tResourceManager=Demo.RM', '\tFirstKey=1', '\tLastKey=10',
  '\tMessageCatalog=demo.cat', '\tDescriptiveMessageSet=1', 'ResourceVariableClass',
  '\tObservationInterval=60', '\tReportingInterval=60', '\tVariableClass=VC1', '',
].join('\n');
// 0-based line numbers of the source
const CLASS_NAME = 8, ATTRIBUTE_NAME = 10, DATATYPE = 14, VARCLASS_USE = 17, VARCLASS_DEF = 27;

async function runExtension() {
  const { api, recorded, user } = createVscode(manifest, semver.minVersion(manifest.engines.vscode).version);
  hookModules(api);
  const spawned = recordSpawns();
  user.set('qecfg.server.path', server);
  user.set('qecfg.warnings', { 'variable-class': false });
  const extension = require(path.resolve(extensionDir, manifest.main));

  const token = new api.CancellationTokenSource().token;
  const dir = fs.mkdtempSync(path.join(os.tmpdir(), 'qecfg-vscode-'));
  try {
    await withTimeout(extension.activate({ subscriptions: [] }), 'activation');
    expect(spawned.length === 1 && spawned[0].command === server && spawned[0].args.join(' ') === '--stdio',
      `the client starts ${server} --stdio: ${JSON.stringify(spawned)}`);
    const provider = (kind) => {
      const found = (recorded.providers[kind] || [])[0];
      const sorted = found && found.selector.map((f) => Object.fromEntries(Object.entries(f).sort()));
      expect(JSON.stringify(sorted) === '[{"language":"qecfg","scheme":"file"}]',
        `a ${kind} provider for qecfg files: ${JSON.stringify(found && found.selector)}`);
      return found ? found.provider : {};
    };

    const file = path.join(dir, 'demo.src');
    const uri = api.Uri.file(file).toString();
    // Does `action`, then waits for the server's next diagnostics of the
    // source and records a failure unless they meet `holds`.
    const after = (action, what, holds) => {
      const next = new Promise((resolve) => {
        const listener = recorded.onDiagnostics((published) => {
          if (published !== uri) return;
          listener.dispose();
          resolve(recorded.diagnostics.get(uri));
        });
      });
      const result = action();
      return withTimeout(next, what)
        .then((d) => expect(holds(d), `${what}: ${JSON.stringify(d)}`), (e) => failures.push(e.message))
        .then(() => result);
    };
    const none = (d) => d.length === 0;
    let document;
    const line = (n) => document.lineAt(n).text;
    const setLine = (n, text) => user.edit(document, [n, 0, n, line(n).length], text);

    // The warning is off by the settings at start, then on by a change.
    document = await after(() => user.open(file, 'qecfg', SOURCE), 'diagnostics on open, the warning off',
      none);
    await after(() => user.set('qecfg.warnings', { 'variable-class': true }), 'the warning switched on', (d) =>
      d.length === 1 && d[0].range.start.line === VARCLASS_USE && d[0].code === 'variable-class' &&
      d[0].severity === api.DiagnosticSeverity.Warning && /Nope/.test(d[0].message));

    // Edits, sent incrementally: one mends the warning, one makes an error.
    await after(() => setLine(VARCLASS_USE, '\tVariableClass=VC1'), 'the diagnostics cleared', none);
    await after(() => setLine(DATATYPE, '\tDataType=Uint32'), 'an error on the data type', (d) =>
      d.length === 1 && d[0].range.start.line === DATATYPE && d[0].severity === api.DiagnosticSeverity.Error &&
      /Uint32/.test(d[0].message));

    // The quick fix for the error, applied as VS Code applies its edit.
    const error = (recorded.diagnostics.get(uri) || [])[0];
    const context = { diagnostics: [error], triggerKind: api.CodeActionTriggerKind.Invoke, only: undefined };
    const actions = error
      ? await withTimeout(provider('codeActions').provideCodeActions(document, error.range, context, token), 'actions')
      : [];
    const fix = (actions || []).find((a) => a.edit);
    expect(fix, `a quick fix with an edit: ${JSON.stringify(actions)}`);
    if (fix) await after(() => applyEdit(user, document, fix.edit), 'no diagnostics after the fix', none);
    expect(line(DATATYPE) === '\tDataType=UInt32', `the quick fix gives ${JSON.stringify(line(DATATYPE))}`);

    const hover = await withTimeout(
      provider('hover').provideHover(document, new api.Position(DATATYPE, 12), token), 'hover');
    const hoverText = hover ? hover.contents.map((c) => c.value || c).join('\n') : '';
    expect(/Float64/.test(hoverText) && /UInt32/.test(hoverText), `the hover lists the data types: ${hoverText}`);

    await after(() => setLine(DATATYPE, '\tDataType='), 'diagnostics of the emptied data type', () => true);
    const completion = await withTimeout(provider('completionItem').provideCompletionItems(document,
      new api.Position(DATATYPE, 10), token, { triggerKind: api.CompletionTriggerKind.Invoke }), 'completion');
    const items = Array.isArray(completion) ? completion : (completion || {}).items || [];
    const labels = items.map((i) => i.label.label || i.label);
    expect(labels.includes('Float64') && labels.includes('UInt32') && !labels.includes('Name'),
      `completion after DataType= offers the data types: ${labels}`);
    await after(() => setLine(DATATYPE, '\tDataType=Float64'), 'no diagnostics after completion', none);

    const definition = await withTimeout(
      provider('definition').provideDefinition(document, new api.Position(VARCLASS_USE, 16), token), 'definition');
    const target = [].concat(definition || [])[0] || {};
    const targetRange = target.range || target.targetRange;
    expect(String(target.uri || target.targetUri) === uri && targetRange && targetRange.start.line === VARCLASS_DEF,
      `the definition of VC1 is on line ${VARCLASS_DEF}: ${JSON.stringify(definition)}`);

    const symbols = await withTimeout(provider('documentSymbol').provideDocumentSymbols(document, token), 'outline');
    const names = (list) => (list || []).flatMap((s) => [s.name, ...names(s.children)]);
    expect(names(symbols).includes('Demo.Thing') && names(symbols).includes('Load'),
      `the outline holds the class and its attribute: ${names(symbols)}`);

    await after(() => setLine(ATTRIBUTE_NAME, '   Name=Load  '), 'no diagnostics for blanks', none);
    const edits = await withTimeout(provider('documentFormattingEdit').provideDocumentFormattingEdits(document,
      { tabSize: 4, insertSpaces: false }, token), 'formatting');
    await after(() => applyEdits(user, document, edits || []), 'no diagnostics after formatting', none);
    expect(document.getText() === SOURCE.replace('\tVariableClass=Nope', '\tVariableClass=VC1'),
      `formatting gives the source back: ${JSON.stringify(document.getText())}`);

    // A class without Name is named after the output: the source's name, or
    // the setting qecfg.outputName.
    const unnamed = (name) => (d) =>
      d.length === 1 && d[0].code === 'unnamed-class' && d[0].message.includes(`'${name}'`);
    await after(() => setLine(CLASS_NAME, ''), 'the class named after the source', unnamed('demo'));
    await after(() => user.set('qecfg.outputName', 'disk.cdef'), 'the class named after the output', unnamed('disk'));

    await withTimeout(Promise.resolve(extension.deactivate()), 'deactivation');
    const status = await withTimeout(spawned[0].exited, 'the server to exit');
    expect(status === 0, `the server exits with status 0, not ${status}`);
  } finally {
    fs.rmSync(dir, { recursive: true, force: true });
    expect(!recorded.messages.some(([kind]) => kind === 'error'), `error messages shown: ${recorded.messages}`);
    if (failures.length) {
      failures.push(`the client's output:\n  ${recorded.output.join('\n  ')}`);
      if (recorded.missing.size) failures.push(`asked of the stand-in, missing: ${[...recorded.missing].join(', ')}`);
    }
  }
}

// Applies text edits of one document from the last to the first, as an
// editor does, so that earlier offsets stay valid.
function applyEdits(user, document, edits) {
  const sorted = [...edits].sort((a, b) => document.offsetAt(b.range.start) - document.offsetAt(a.range.start));
  for (const { range, newText } of sorted)
    user.edit(document, [range.start.line, range.start.character, range.end.line, range.end.character], newText);
}

function applyEdit(user, document, workspaceEdit) {
  for (const [uri, edits] of workspaceEdit.entries()) {
    expect(uri.toString() === document.uri.toString(), `an edit of another file: ${uri}`);
    applyEdits(user, document, edits);
  }
}

async function main() {
  checkManifest();
  await runExtension();
  for (const f of failures) console.error(f);
  process.exit(failures.length ? 1 : 0);
}

main().catch((e) => {
  console.error(e);
  for (const f of failures) console.error(f);
  process.exit(1);
});
