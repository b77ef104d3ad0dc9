// Port forwarding rules as a file: what is exported, and what of a file is taken.
import { type Forward, judgeAlone, type Fault } from './forwards';

const format = 'vornrouter-port-forwards';
const version = 1;
export const fileLimit = 1 << 20; // bytes; a thousand rules are a fifth of it
export const ruleLimit = 1000;
const textLimit = 255;

export function exportForwards(rules: Forward[]): string {
  const kept = rules.map(({ enabled, service, sourcePort, protocol, targetIP, targetPort }) => ({
    enabled,
    service,
    sourcePort,
    protocol,
    targetIP,
    targetPort,
  }));
  return `${JSON.stringify({ format, version, rules: kept }, null, 2)}\n`;
}

export type ImportProblem =
  | { code: 'tooLarge' | 'noJson' | 'otherFormat' | 'newerVersion' | 'noRules' | 'tooMany' }
  | { code: 'noObject' | 'unknownMember' | 'wrongType' | 'tooLong' | 'controlCharacter'; rule: number; field: string }
  | { code: 'fault'; rule: number; field: string; fault: Fault };

export type ImportResult = { rules: Forward[]; problems: ImportProblem[] };

const texts = ['service', 'sourcePort', 'protocol', 'targetIP', 'targetPort'] as const;

function checkText(value: unknown, rule: number, field: string): ImportProblem | undefined {
  if (typeof value !== 'string') {
    return { code: 'wrongType', rule, field };
  }
  if (value.length > textLimit) {
    return { code: 'tooLong', rule, field };
  }
  // eslint-disable-next-line no-control-regex
  return /[\u0000-\u001f\u007f]/.test(value) ? { code: 'controlCharacter', rule, field } : undefined;
}

function readRule(value: unknown, rule: number): Forward | ImportProblem {
  if (typeof value !== 'object' || value === null || Array.isArray(value)) {
    return { code: 'noObject', rule, field: '' };
  }
  const object = value as Record<string, unknown>;
  const unknown = Object.keys(object).find((key) => !['id', 'enabled', ...texts].includes(key));
  if (unknown !== undefined) {
    return { code: 'unknownMember', rule, field: unknown };
  }
  if (typeof object.enabled !== 'boolean') {
    return { code: 'wrongType', rule, field: 'enabled' };
  }
  for (const field of texts) {
    const problem = checkText(object[field], rule, field);
    if (problem) {
      return problem;
    }
  }
  const read = Object.fromEntries(texts.map((field) => [field, object[field]])) as Omit<Forward, 'enabled'>;
  const forward = { enabled: object.enabled, ...read };
  const fault = judgeAlone(forward);
  return fault ? { code: 'fault', rule, field: fault.field, fault } : forward;
}

/** Reads a whole file. Rules count from 1, as a person counts; a file with a problem gives no rules. */
export function importForwards(text: string): ImportResult {
  const refuse = (code: 'tooLarge' | 'noJson' | 'otherFormat' | 'newerVersion' | 'noRules' | 'tooMany') => ({
    rules: [],
    problems: [{ code }],
  });
  if (text.length > fileLimit) {
    return refuse('tooLarge');
  }
  let value: unknown;
  try {
    value = JSON.parse(text.replace(/^\uFEFF/, '')); // an editor may have put a mark in front
  } catch {
    return refuse('noJson');
  }
  const file = (typeof value === 'object' && value !== null ? value : {}) as Record<string, unknown>;
  if (file.format !== format || typeof file.version !== 'number') {
    return refuse('otherFormat');
  }
  if (file.version !== version) {
    return refuse('newerVersion');
  }
  if (!Array.isArray(file.rules) || file.rules.length === 0) {
    return refuse('noRules');
  }
  if (file.rules.length > ruleLimit) {
    return refuse('tooMany');
  }
  const rules: Forward[] = [];
  const problems: ImportProblem[] = [];
  file.rules.forEach((element, index) => {
    const read = readRule(element, index + 1);
    if ('code' in read) {
      problems.push(read);
    } else {
      rules.push(read);
    }
  });
  return { rules: problems.length === 0 ? rules : [], problems };
}
