// The generated TextMate grammar on the engine VS Code uses (vscode-textmate
// with the Oniguruma expressions of vscode-oniguruma), and the VS Code
// extension's manifest against the grammar. Exits with status 1 and one line
// per failure.
'use strict';
const fs = require('fs');
const path = require('path');

const root = path.resolve(__dirname, '..', '..');
const extension = path.join(root, 'editors', 'vscode');
const grammarPath = path.join(extension, 'syntaxes', 'qecfg.tmLanguage.json');

let vsctm, oniguruma;
try {
  vsctm = require('vscode-textmate');
  oniguruma = require('vscode-oniguruma');
} catch (e) {
  console.error(`${e.message}\nInstall the engine first: npm ci --prefix tests/editors`);
  process.exit(1);
}

const failures = [];
function expect(ok, what) {
  if (!ok) failures.push(what);
}

async function loadGrammar() {
  const wasm = fs.readFileSync(require.resolve('vscode-oniguruma/release/onig.wasm'));
  await oniguruma.loadWASM(wasm.buffer.slice(wasm.byteOffset, wasm.byteOffset + wasm.byteLength));
  const registry = new vsctm.Registry({
    onigLib: Promise.resolve({
      createOnigScanner: (patterns) => new oniguruma.OnigScanner(patterns),
      createOnigString: (s) => new oniguruma.OnigString(s),
    }),
    loadGrammar: async (scope) =>
      scope === 'source.qecfg' ? vsctm.parseRawGrammar(fs.readFileSync(grammarPath, 'utf8'), grammarPath) : null,
  });
  return registry.loadGrammar('source.qecfg');
}

// The tokens of one line, each with its text and its innermost scope.
function tokens(grammar, line) {
  return grammar
    .tokenizeLine(line, vsctm.INITIAL)
    .tokens.map((t) => ({ text: line.slice(t.startIndex, t.endIndex), scope: t.scopes[t.scopes.length - 1] }));
}

// `text` must be exactly one token of the line, of the given scope.
function expectToken(grammar, line, text, scope) {
  const all = tokens(grammar, line);
  const found = all.find((t) => t.text === text);
  expect(
    found && found.scope === scope,
    `${JSON.stringify(line)}: ${JSON.stringify(text)} should be one token of ${scope}; tokens: ` +
      all.map((t) => `${JSON.stringify(t.text)} ${t.scope}`).join(', ')
  );
}

function checkManifest(grammar) {
  const manifest = JSON.parse(fs.readFileSync(path.join(extension, 'package.json'), 'utf8'));
  const raw = JSON.parse(fs.readFileSync(grammarPath, 'utf8'));
  const language = manifest.contributes.languages.find((l) => l.id === 'qecfg');
  const extensions = [...language.extensions].sort();
  const fileTypes = raw.fileTypes.map((t) => '.' + t).sort();
  expect(
    JSON.stringify(extensions) === JSON.stringify(fileTypes),
    `package.json extensions ${extensions} differ from the grammar's fileTypes ${fileTypes}`
  );
  const contributed = manifest.contributes.grammars.find((g) => g.language === 'qecfg');
  expect(contributed.scopeName === raw.scopeName, 'package.json names another scope than the grammar');
  expect(path.resolve(extension, contributed.path) === grammarPath, 'package.json names another grammar file');

  // Only a file that starts with a ControlDefinition header is one of ours
  // by its first line; a comment or a script is not.
  const firstLine = new RegExp(language.firstLine);
  for (const line of ['ControlDefinition', 'ControlDefinition   # a class', 'ControlDefinition\t// a class'])
    expect(firstLine.test(line), `firstLine should match ${JSON.stringify(line)}`);
  for (const line of ['#!/bin/sh', '# a comment', '// a comment', '', 'ControlDefinitions', 'ResourceClass',
                      '<?xml version="1.0"?>', 'int main() {', '    ControlDefinition'])
    expect(!firstLine.test(line), `firstLine should not match ${JSON.stringify(line)}`);
}

async function main() {
  const grammar = await loadGrammar();
  expectToken(grammar, 'ResourceClass # the class', 'ResourceClass', 'entity.name.section.stanza.qecfg');
  expectToken(grammar, 'ResourceClass # the class', '# the class', 'comment.line.qecfg');
  expectToken(grammar, 'ResourceClass\t// the class', '// the class', 'comment.line.qecfg');
  expectToken(grammar, 'ResourceClassX', 'ResourceClassX', 'invalid.illegal.stanza.qecfg');
  expectToken(grammar, 'ResourceClass x', 'ResourceClass x', 'invalid.illegal.stanza.qecfg');
  expectToken(grammar, '    FileVersion=2.1.0.0', '2.1.0.0', 'constant.numeric.qecfg');
  expectToken(grammar, '    DefaultValue=-40.0', '-40.0', 'constant.numeric.qecfg');
  expectToken(grammar, '    Range=-5,1e-40', '1e-40', 'constant.numeric.qecfg');
  expectToken(grammar, '    DataType=UInt32 # the size', '# the size', 'comment.line.qecfg');
  checkManifest(grammar);
  for (const f of failures) console.error(f);
  process.exitCode = failures.length ? 1 : 0;
}

main().catch((e) => {
  console.error(e);
  process.exitCode = 1;
});
