import type { JSX } from 'preact';

import { ApiError } from '../../api';
import { format, t } from '../../text';
import { Button, Dialog, ErrorNotice, useAction } from '../../ui';
import { Effects, modeTexts } from '../topology';
import { switchTo } from './follower';

const UNDER_WAY = 4340; // the router's code for a switch that is not through

export function ConfirmSwitch(props: {
  from: string;
  mode: string;
  onClose: () => void;
  onUnderWay: () => void;
}): JSX.Element {
  const texts = t().topology;
  const mode = modeTexts(props.mode).name;
  const [busy, run, error] = useAction(() => switchTo(props.from, props.mode));
  const act = async (): Promise<void> => {
    if (await run()) props.onClose();
  };
  const isUnderWay = error instanceof ApiError && error.code === UNDER_WAY;
  return (
    <Dialog
      title={format(texts.confirmTitle, { mode })}
      onClose={props.onClose}
      actions={
        <>
          <Button onClick={props.onClose}>{t().common.cancel}</Button>
          <Button kind="danger" busy={busy} onClick={() => void act()}>
            {texts.confirm}
          </Button>
        </>
      }
    >
      <p>{format(texts.confirmLead, { host: location.host })}</p>
      <Effects mode={props.mode} />
      <p class="muted">{texts.keeps}</p>
      <ErrorNotice
        error={error}
        {...(isUnderWay && {
          retry: () => {
            props.onClose();
            props.onUnderWay();
          },
        })}
      />
    </Dialog>
  );
}
