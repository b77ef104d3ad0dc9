// The rules as a file: saved by the browser, and read again after a look at each rule.
import type { JSX } from 'preact';
import { useRef, useState } from 'preact/hooks';

import { exportForwards, fileLimit, importForwards, type ImportProblem } from '../../logic/forward_file';
import { type Forward, judgeForwards, type Lan } from '../../logic/forwards';
import { format, t } from '../../text';
import { Button, Dialog, ErrorNotice, Notice, useAction } from '../../ui';
import { managementPorts, problemText } from './words';

const SHOWN = 8; // problems of a file; more help nobody

interface Loaded {
  name: string;
  rules: Forward[];
  problems: ImportProblem[];
  isUnreadable: boolean;
}

function offer(rules: Forward[], name: string): void {
  const address = URL.createObjectURL(new Blob([exportForwards(rules)], { type: 'application/json' }));
  const link = document.createElement('a');
  link.href = address;
  link.download = name;
  link.click();
  setTimeout(() => URL.revokeObjectURL(address), 1000);
}

async function load(file: File): Promise<Loaded> {
  try {
    const text = file.size > fileLimit ? ' '.repeat(fileLimit + 1) : await file.text();
    return { name: file.name, isUnreadable: false, ...importForwards(text) };
  } catch {
    return { name: file.name, isUnreadable: true, rules: [], problems: [] };
  }
}

interface FileButtonsProps {
  rules: Forward[];
  lans: Lan[] | undefined;
  onStore: (rules: Forward[], said: string) => Promise<void>;
}

export function FileButtons({ rules, lans, onStore }: FileButtonsProps): JSX.Element {
  const texts = t().portforward;
  const input = useRef<HTMLInputElement>(null);
  const [loaded, setLoaded] = useState<Loaded>();
  const take = async (file: File | undefined): Promise<void> => {
    if (file) setLoaded(await load(file));
    if (input.current) input.current.value = ''; // the same file may be taken again
  };
  return (
    <>
      <input
        ref={input}
        type="file"
        accept=".json,application/json"
        hidden
        onChange={(event) => void take(event.currentTarget.files?.[0])}
      />
      <Button icon="upload" onClick={() => input.current?.click()}>
        {texts.importing}
      </Button>
      <Button icon="download" disabled={rules.length === 0} onClick={() => offer(rules, texts.fileName)}>
        {texts.exporting}
      </Button>
      {loaded && (
        <ImportDialog
          loaded={loaded}
          present={rules}
          lans={lans}
          onStore={(list) => onStore(list, format(texts.imported, { count: loaded.rules.length }))}
          onClose={() => setLoaded(undefined)}
        />
      )}
    </>
  );
}

interface ImportDialogProps {
  loaded: Loaded;
  present: Forward[];
  lans: Lan[] | undefined;
  onStore: (rules: Forward[]) => Promise<void>;
  onClose: () => void;
}

function ImportDialog({ loaded, present, lans, onStore, onClose }: ImportDialogProps): JSX.Element {
  const texts = t().portforward;
  const [busy, run, error] = useAction(onStore);
  const isGood = loaded.rules.length > 0;
  const act = async (list: Forward[]): Promise<void> => {
    if (await run(list)) onClose();
  };
  const together = [...present, ...loaded.rules];
  const verdicts = lans ? judgeForwards(together, { lans, managementPorts: managementPorts() }) : [];
  const leftOut = verdicts.filter((verdict) => verdict.state === 'leftOut').length;
  return (
    <Dialog
      title={format(texts.importTitle, { file: loaded.name })}
      onClose={onClose}
      actions={
        isGood ? (
          <>
            <Button onClick={onClose}>{t().common.cancel}</Button>
            {present.length > 0 && (
              <Button busy={busy} onClick={() => void act(together)}>
                {texts.append}
              </Button>
            )}
            <Button kind={present.length > 0 ? 'danger' : 'primary'} busy={busy} onClick={() => void act(loaded.rules)}>
              {present.length > 0 ? texts.replace : t().common.save}
            </Button>
          </>
        ) : (
          <Button onClick={onClose}>{t().common.close}</Button>
        )
      }
    >
      {isGood ? (
        <>
          <p>{format(texts.importLead, { count: loaded.rules.length, present: present.length })}</p>
          {leftOut > 0 && <Notice kind="warning">{format(texts.importLeftOut, { count: leftOut })}</Notice>}
        </>
      ) : (
        <Problems loaded={loaded} />
      )}
      <ErrorNotice error={error} />
    </Dialog>
  );
}

function Problems({ loaded }: { loaded: Loaded }): JSX.Element {
  const texts = t().portforward;
  const lines = loaded.isUnreadable ? [texts.unreadable] : loaded.problems.map(problemText);
  return (
    <>
      <Notice kind="error">{texts.importFailed}</Notice>
      <ul class="problems">
        {lines.slice(0, SHOWN).map((line) => (
          <li key={line}>{line}</li>
        ))}
        {lines.length > SHOWN && <li>{format(texts.moreProblems, { count: lines.length - SHOWN })}</li>}
      </ul>
    </>
  );
}
