// Starts qecfg-lsp for class definition sources and passes it the
// extension's settings (qecfg.warnings, qecfg.outputName).
'use strict';
const vscode = require('vscode');
const { LanguageClient, TransportKind } = require('vscode-languageclient/node');

let client;

function serverSettings() {
  const config = vscode.workspace.getConfiguration('qecfg');
  return { warnings: config.get('warnings', {}), outputName: config.get('outputName', '') };
}

function activate(context) {
  const command = vscode.workspace.getConfiguration('qecfg').get('server.path', 'qecfg-lsp');
  // TransportKind.stdio passes --stdio, which the server accepts.
  const serverOptions = { command, transport: TransportKind.stdio };
  const clientOptions = {
    documentSelector: [{ scheme: 'file', language: 'qecfg' }],
    initializationOptions: serverSettings(),
    // Changes to the qecfg.* settings reach the server as
    // workspace/didChangeConfiguration with the settings under "qecfg".
    synchronize: { configurationSection: 'qecfg' },
  };
  client = new LanguageClient('qecfg-lsp', 'qecfg language server', serverOptions, clientOptions);
  context.subscriptions.push(client.start());
}

function deactivate() {
  return client ? client.stop() : undefined;
}

module.exports = { activate, deactivate };
