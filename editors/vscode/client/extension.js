// Starts qecfg-lsp for class definition sources and passes it the
// extension's settings (qecfg.warnings, qecfg.outputName).
'use strict';
const vscode = require('vscode');
const { LanguageClient, TransportKind } = require('vscode-languageclient/node');

let client;

function serverSettings(config) {
  return { warnings: config.get('warnings', {}), outputName: config.get('outputName', '') };
}

// The client starts the server; activation fails when the server cannot
// be started, so that VS Code shows why.
function activate() {
  const config = vscode.workspace.getConfiguration('qecfg');
  // TransportKind.stdio passes --stdio, which the server accepts.
  const serverOptions = { command: config.get('server.path', 'qecfg-lsp'), transport: TransportKind.stdio };
  const clientOptions = {
    documentSelector: [{ scheme: 'file', language: 'qecfg' }],
    initializationOptions: serverSettings(config),
    // Changes to the qecfg.* settings reach the server as
    // workspace/didChangeConfiguration with the settings under "qecfg".
    synchronize: { configurationSection: 'qecfg' },
  };
  client = new LanguageClient('qecfg-lsp', 'qecfg language server', serverOptions, clientOptions);
  return client.start();
}

function deactivate() {
  return client ? client.stop() : undefined;
}

module.exports = { activate, deactivate };
