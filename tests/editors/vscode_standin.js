// A stand-in for the `vscode` module, with what vscode-languageclient uses
// to run an extension outside VS Code. Settings are the defaults the
// extension's manifest contributes, overridden by the test; the test opens
// and edits documents and changes settings; what the client registers,
// publishes and shows is recorded. A name the client asks for that the
// stand-in lacks is recorded too, so that a failure can say what is missing.
'use strict';
const { pathToFileURL } = require('url');

class Disposable {
  constructor(onDispose) {
    this.onDispose = onDispose;
  }
  dispose() {
    const onDispose = this.onDispose;
    this.onDispose = undefined;
    if (onDispose) onDispose();
  }
  static from(...disposables) {
    return new Disposable(() => disposables.forEach((d) => d && d.dispose()));
  }
}

class EventEmitter {
  constructor() {
    this.listeners = new Set();
    this.event = (listener, thisArg, disposables) => {
      const bound = listener.bind(thisArg);
      this.listeners.add(bound);
      const d = new Disposable(() => this.listeners.delete(bound));
      if (Array.isArray(disposables)) disposables.push(d);
      return d;
    };
  }
  fire(value) {
    for (const listener of [...this.listeners]) listener(value);
  }
  dispose() {
    this.listeners.clear();
  }
}

const neverFires = new EventEmitter().event;

class Uri {
  constructor(scheme, authority, path, query, fragment) {
    Object.assign(this, { scheme, authority, path, query, fragment });
  }
  static parse(text) {
    const u = new URL(text);
    return new Uri(u.protocol.slice(0, -1), u.host, decodeURIComponent(u.pathname), u.search.slice(1), u.hash.slice(1));
  }
  static file(path) {
    return new Uri('file', '', path, '', '');
  }
  get fsPath() {
    return this.path;
  }
  toString() {
    return this.scheme === 'file' ? pathToFileURL(this.path).href : `${this.scheme}://${this.authority}${this.path}`;
  }
  toJSON() {
    return this.toString();
  }
}

class Position {
  constructor(line, character) {
    this.line = line;
    this.character = character;
  }
}

class Range {
  constructor(a, b, c, d) {
    [this.start, this.end] = typeof a === 'number' ? [new Position(a, b), new Position(c, d)] : [a, b];
  }
}

// A class whose constructor arguments become the named fields.
function fields(...names) {
  return class {
    constructor(...args) {
      names.forEach((name, i) => (this[name] = args[i]));
    }
  };
}

class MarkdownString {
  constructor(value = '', supportThemeIcons = false) {
    this.value = value;
    this.supportThemeIcons = supportThemeIcons;
  }
  appendText(text) {
    this.value += text;
    return this;
  }
  appendMarkdown(text) {
    this.value += text;
    return this;
  }
  appendCodeblock(code, language = '') {
    this.value += `\n\`\`\`${language}\n${code}\n\`\`\`\n`;
    return this;
  }
}

class Hover {
  constructor(contents, range) {
    this.contents = Array.isArray(contents) ? contents : [contents];
    this.range = range;
  }
}

class TextEdit extends fields('range', 'newText') {
  static replace(range, newText) {
    return new TextEdit(range, newText);
  }
  static insert(position, newText) {
    return new TextEdit(new Range(position, position), newText);
  }
  static delete(range) {
    return new TextEdit(range, '');
  }
}

class WorkspaceEdit {
  constructor() {
    this.edits = new Map();
  }
  set(uri, edits) {
    this.edits.set(uri.toString(), { uri, edits: [...edits] });
  }
  get(uri) {
    return (this.edits.get(uri.toString()) || { edits: [] }).edits;
  }
  has(uri) {
    return this.edits.has(uri.toString());
  }
  replace(uri, range, newText) {
    this.set(uri, [...this.get(uri), new TextEdit(range, newText)]);
  }
  insert(uri, position, newText) {
    this.replace(uri, new Range(position, position), newText);
  }
  delete(uri, range) {
    this.replace(uri, range, '');
  }
  entries() {
    return [...this.edits.values()].map(({ uri, edits }) => [uri, edits]);
  }
  get size() {
    return this.edits.size;
  }
}

class DocumentSymbol extends fields('name', 'detail', 'kind', 'range', 'selectionRange') {
  constructor(...args) {
    super(...args);
    this.children = [];
  }
}

class CompletionList {
  constructor(items = [], isIncomplete = false) {
    this.items = items;
    this.isIncomplete = isIncomplete;
  }
}

class CodeActionKind {
  constructor(value) {
    this.value = value;
  }
  append(part) {
    return new CodeActionKind(this.value ? `${this.value}.${part}` : part);
  }
  contains(other) {
    return this.value === '' || other.value === this.value || other.value.startsWith(this.value + '.');
  }
  intersects(other) {
    return this.contains(other) || other.contains(this);
  }
}
for (const [name, value] of Object.entries({
  Empty: '', QuickFix: 'quickfix', Refactor: 'refactor', RefactorExtract: 'refactor.extract',
  RefactorInline: 'refactor.inline', RefactorMove: 'refactor.move', RefactorRewrite: 'refactor.rewrite',
  Source: 'source', SourceOrganizeImports: 'source.organizeImports', SourceFixAll: 'source.fixAll',
  Notebook: 'notebook',
}))
  CodeActionKind[name] = new CodeActionKind(value);

// An enumeration of names numbered from `first`.
function numbered(first, ...names) {
  return Object.fromEntries(names.map((name, i) => [name, first + i]));
}

const enums = {
  DiagnosticSeverity: numbered(0, 'Error', 'Warning', 'Information', 'Hint'),
  DiagnosticTag: numbered(1, 'Unnecessary', 'Deprecated'),
  CompletionItemKind: numbered(0, 'Text', 'Method', 'Function', 'Constructor', 'Field', 'Variable', 'Class',
    'Interface', 'Module', 'Property', 'Unit', 'Value', 'Enum', 'Keyword', 'Snippet', 'Color', 'File', 'Reference',
    'Folder', 'EnumMember', 'Constant', 'Struct', 'Event', 'Operator', 'TypeParameter', 'User', 'Issue'),
  CompletionItemTag: numbered(1, 'Deprecated'),
  CompletionTriggerKind: numbered(0, 'Invoke', 'TriggerCharacter', 'TriggerForIncompleteCompletions'),
  SymbolKind: numbered(0, 'File', 'Module', 'Namespace', 'Package', 'Class', 'Method', 'Property', 'Field',
    'Constructor', 'Enum', 'Interface', 'Function', 'Variable', 'Constant', 'String', 'Number', 'Boolean', 'Array',
    'Object', 'Key', 'Null', 'EnumMember', 'Struct', 'Event', 'Operator', 'TypeParameter'),
  SymbolTag: numbered(1, 'Deprecated'),
  DocumentHighlightKind: numbered(0, 'Text', 'Read', 'Write'),
  CodeActionTriggerKind: numbered(1, 'Invoke', 'Automatic'),
  SignatureHelpTriggerKind: numbered(1, 'Invoke', 'TriggerCharacter', 'ContentChange'),
  InlineCompletionTriggerKind: numbered(0, 'Invoke', 'Automatic'),
  FoldingRangeKind: numbered(1, 'Comment', 'Imports', 'Region'),
  TextDocumentSaveReason: numbered(1, 'Manual', 'AfterDelay', 'FocusOut'),
  NotebookCellKind: numbered(1, 'Markup', 'Code'),
  EndOfLine: numbered(1, 'LF', 'CRLF'),
  LogLevel: numbered(0, 'Off', 'Trace', 'Debug', 'Info', 'Warning', 'Error'),
  ProgressLocation: { SourceControl: 1, Window: 10, Notification: 15 },
  ConfigurationTarget: numbered(1, 'Global', 'Workspace', 'WorkspaceFolder'),
  UIKind: numbered(1, 'Desktop', 'Web'),
};

// A document as the editor holds it: the test changes it through the
// stand-in, which tells the client as VS Code would.
class TextDocument {
  constructor(path, languageId, text) {
    Object.assign(this, { uri: Uri.file(path), fileName: path, languageId, text, version: 1 });
    Object.assign(this, { isUntitled: false, isDirty: false, isClosed: false, eol: enums.EndOfLine.LF });
  }
  get lineCount() {
    return this.text.split('\n').length;
  }
  offsetAt(position) {
    const lines = this.text.split('\n');
    const line = Math.min(position.line, lines.length - 1);
    let offset = 0;
    for (let i = 0; i < line; i++) offset += lines[i].length + 1;
    return offset + Math.min(position.character, lines[line].length);
  }
  getText(range) {
    return range ? this.text.slice(this.offsetAt(range.start), this.offsetAt(range.end)) : this.text;
  }
  lineAt(lineOrPosition) {
    const line = typeof lineOrPosition === 'number' ? lineOrPosition : lineOrPosition.line;
    const text = this.text.split('\n')[line];
    const range = new Range(line, 0, line, text.length);
    return { lineNumber: line, text, range, rangeIncludingLineBreak: range, isEmptyOrWhitespace: !text.trim() };
  }
}

// Which of a document selector's filters (a language id, or objects of
// language and scheme) the document meets: 10 for a match, 0 for none.
function match(selector, document) {
  const filters = Array.isArray(selector) ? selector : [selector];
  return filters.some((f) => {
    if (typeof f === 'string') return f === document.languageId || f === '*';
    if (f.pattern !== undefined || f.notebookType !== undefined)
      throw new Error(`the stand-in matches no pattern or notebook filter: ${JSON.stringify(f)}`);
    return (!f.language || f.language === document.languageId) && (!f.scheme || f.scheme === document.uri.scheme);
  })
    ? 10
    : 0;
}

// The settings, by full name ('qecfg.server.path'): the manifest's defaults
// and the test's values. A section ('qecfg') reads as the object of its keys.
class Settings {
  constructor(manifest) {
    const properties = ((manifest.contributes || {}).configuration || {}).properties || {};
    this.values = new Map(Object.entries(properties).map(([name, p]) => [name, p.default]));
  }
  read(name) {
    if (this.values.has(name)) return structuredClone(this.values.get(name));
    let found;
    for (const [key, value] of this.values) {
      if (!key.startsWith(name + '.')) continue;
      const path = key.slice(name.length + 1).split('.');
      found = found || {};
      let node = found;
      for (const part of path.slice(0, -1)) node = node[part] = node[part] || {};
      node[path[path.length - 1]] = structuredClone(value);
    }
    return found;
  }
  section(prefix) {
    const full = (key) => (prefix ? `${prefix}.${key}` : key);
    const config = {
      get: (key, fallback) => {
        const value = this.read(full(key));
        return value === undefined ? fallback : value;
      },
      has: (key) => this.read(full(key)) !== undefined,
      inspect: (key) => ({ key: full(key), defaultValue: this.read(full(key)) }),
      update: () => Promise.reject(new Error('the stand-in does not write settings')),
    };
    return config;
  }
}

// Records the names asked of `object` that it lacks (not the probes of
// module loaders and promises).
function watched(object, where, missing) {
  return new Proxy(object, {
    get(target, name) {
      if (!(name in target) && typeof name === 'string' && !name.startsWith('__') && name !== 'then')
        missing.add(`${where}.${name}`);
      return target[name];
    },
  });
}

// A fresh `vscode` module and what it records.
function createVscode(manifest, version) {
  const settings = new Settings(manifest);
  const missing = new Set();
  const events = {};
  const event = (name) => (events[name] = events[name] || new EventEmitter()).event;
  const diagnosticsChanged = new EventEmitter();
  const recorded = {
    missing,
    diagnostics: new Map(), // uri text -> diagnostics
    providers: {}, // e.g. hover -> [{ selector, provider }]
    commands: new Map(),
    messages: [], // [kind, text] shown to the user
    output: [], // lines of the output channels
    appliedEdits: [],
    onDiagnostics: diagnosticsChanged.event,
  };
  const registration = (kind) => (selector, provider) => {
    (recorded.providers[kind] = recorded.providers[kind] || []).push({ selector, provider });
    return new Disposable(() => {});
  };
  const languages = { createDiagnosticCollection: (name) => diagnosticCollection(name), match };
  for (const kind of ['CallHierarchy', 'CodeActions', 'CodeLens', 'Color', 'CompletionItem', 'Declaration',
    'Definition', 'DocumentFormattingEdit', 'DocumentHighlight', 'DocumentLink', 'DocumentRangeFormattingEdit',
    'DocumentRangeSemanticTokens', 'DocumentSemanticTokens', 'DocumentSymbol', 'FoldingRange', 'Hover',
    'Implementation', 'InlayHints', 'InlineCompletionItem', 'InlineValues', 'LinkedEditingRange',
    'OnTypeFormattingEdit', 'Reference', 'Rename', 'SelectionRange', 'SignatureHelp', 'TypeDefinition',
    'TypeHierarchy', 'WorkspaceSymbol'])
    languages[`register${kind}Provider`] = registration(kind.charAt(0).toLowerCase() + kind.slice(1));

  function diagnosticCollection(name) {
    const set = (uri, diagnostics) => {
      recorded.diagnostics.set(uri.toString(), diagnostics || []);
      diagnosticsChanged.fire(uri.toString());
    };
    return {
      name,
      set: (uriOrEntries, diagnostics) =>
        Array.isArray(uriOrEntries) ? uriOrEntries.forEach(([u, d]) => set(u, d)) : set(uriOrEntries, diagnostics),
      delete: (uri) => set(uri, []),
      get: (uri) => recorded.diagnostics.get(uri.toString()),
      has: (uri) => recorded.diagnostics.has(uri.toString()),
      forEach: (fn) => recorded.diagnostics.forEach((d, u) => fn(Uri.parse(u), d)),
      clear: () => [...recorded.diagnostics.keys()].forEach((u) => set(Uri.parse(u), [])),
      dispose: () => {},
    };
  }

  const outputChannel = (name) => {
    const line = (level) => (text) => recorded.output.push(`${name} [${level}] ${text}`);
    return {
      name, logLevel: enums.LogLevel.Info, onDidChangeLogLevel: neverFires,
      append: line('text'), appendLine: line('text'), replace: line('text'),
      trace: line('trace'), debug: line('debug'), info: line('info'), warn: line('warning'), error: line('error'),
      clear() {}, show() {}, hide() {}, dispose() {},
    };
  };
  const show = (kind) => (text) => {
    recorded.messages.push([kind, text]);
    return Promise.resolve(undefined);
  };
  const textDocuments = [];

  const api = {
    version,
    __esModule: true, // the client's module loader takes it as it is
    Disposable, EventEmitter, Uri, Position, Range, MarkdownString, Hover, TextEdit, WorkspaceEdit, CodeActionKind,
    Location: fields('uri', 'range'),
    Diagnostic: fields('range', 'message', 'severity'),
    DiagnosticRelatedInformation: fields('location', 'message'),
    CompletionItem: fields('label', 'kind'),
    CompletionList,
    SnippetString: fields('value'),
    SymbolInformation: fields('name', 'kind', 'containerName', 'location'),
    DocumentSymbol,
    CodeAction: fields('title', 'kind'),
    CodeLens: fields('range', 'command'),
    DocumentLink: fields('range', 'target'),
    InlayHint: fields('position', 'label', 'kind'),
    CallHierarchyItem: fields('kind', 'name', 'detail', 'uri', 'range', 'selectionRange'),
    TypeHierarchyItem: fields('kind', 'name', 'detail', 'uri', 'range', 'selectionRange'),
    RelativePattern: fields('base', 'pattern'),
    CancellationError: class extends Error {},
    CancellationTokenSource: class {
      constructor() {
        const cancelled = new EventEmitter();
        this.token = { isCancellationRequested: false, onCancellationRequested: cancelled.event };
        this.cancel = () => {
          this.token.isCancellationRequested = true;
          cancelled.fire();
        };
        this.dispose = () => cancelled.dispose();
      }
    },
    TabInputText: class {}, TabInputTextDiff: class {}, TabInputNotebook: class {}, TabInputCustom: class {},
    ...enums,
    workspace: watched({
      getConfiguration: (section) => settings.section(section),
      textDocuments,
      notebookDocuments: [],
      workspaceFolders: undefined,
      getWorkspaceFolder: () => undefined,
      onDidOpenTextDocument: event('open'),
      onDidChangeTextDocument: event('change'),
      onDidCloseTextDocument: event('close'),
      onDidSaveTextDocument: event('save'),
      onWillSaveTextDocument: neverFires,
      onDidChangeConfiguration: event('configuration'),
      onDidChangeWorkspaceFolders: neverFires,
      onDidCreateFiles: neverFires, onDidRenameFiles: neverFires, onDidDeleteFiles: neverFires,
      onWillCreateFiles: neverFires, onWillRenameFiles: neverFires, onWillDeleteFiles: neverFires,
      onDidOpenNotebookDocument: neverFires,
      onDidChangeNotebookDocument: neverFires,
      onDidSaveNotebookDocument: neverFires,
      onDidCloseNotebookDocument: neverFires,
      createFileSystemWatcher: () =>
        ({ onDidCreate: neverFires, onDidChange: neverFires, onDidDelete: neverFires, dispose() {} }),
      registerTextDocumentContentProvider: () => new Disposable(() => {}),
      applyEdit: (edit) => {
        recorded.appliedEdits.push(edit);
        return Promise.resolve(true);
      },
    }, 'workspace', missing),
    window: watched({
      createOutputChannel: outputChannel,
      showErrorMessage: show('error'),
      showWarningMessage: show('warning'),
      showInformationMessage: show('information'),
      activeTextEditor: undefined,
      visibleTextEditors: [],
      tabGroups: { all: [], onDidChangeTabs: neverFires, onDidChangeTabGroups: neverFires },
      onDidChangeActiveTextEditor: neverFires,
      onDidChangeVisibleTextEditors: neverFires,
      withProgress: (options, task) => task({ report() {} }, new api.CancellationTokenSource().token),
    }, 'window', missing),
    languages: watched(languages, 'languages', missing),
    commands: watched({
      registerCommand: (id, fn) => {
        recorded.commands.set(id, fn);
        return new Disposable(() => recorded.commands.delete(id));
      },
      executeCommand: (id, ...args) => Promise.resolve(recorded.commands.get(id)?.(...args)),
    }, 'commands', missing),
    env: watched({ appName: 'stand-in', language: 'en', machineId: 'stand-in', sessionId: 'stand-in',
      uiKind: enums.UIKind.Desktop, openExternal: () => Promise.resolve(false) }, 'env', missing),
    extensions: watched({ all: [], getExtension: () => undefined, onDidChange: neverFires }, 'extensions', missing),
  };

  // What the test does as the user.
  const user = {
    open(path, languageId, text) {
      const document = new TextDocument(path, languageId, text);
      textDocuments.push(document);
      events.open?.fire(document);
      return document;
    },
    // Replaces the text of `range` ([line, character, line, character]).
    edit(document, [l1, c1, l2, c2], text) {
      const range = new Range(l1, c1, l2, c2);
      const rangeOffset = document.offsetAt(range.start);
      const rangeLength = document.offsetAt(range.end) - rangeOffset;
      document.text = document.text.slice(0, rangeOffset) + text + document.text.slice(rangeOffset + rangeLength);
      document.version++;
      events.change?.fire({ document, contentChanges: [{ range, rangeOffset, rangeLength, text }], reason: undefined });
    },
    close(document) {
      textDocuments.splice(textDocuments.indexOf(document), 1);
      document.isClosed = true;
      events.close?.fire(document);
    },
    // Sets a setting by its full name, and tells the extensions as VS Code would.
    set(name, value) {
      settings.values.set(name, value);
      const affectsConfiguration = (section) => name === section || name.startsWith(section + '.');
      events.configuration?.fire({ affectsConfiguration });
    },
  };
  return { api: watched(api, 'vscode', missing), recorded, user };
}

module.exports = { createVscode };
