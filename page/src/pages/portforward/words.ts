// Faults of rules in words.
import type { ImportProblem } from '../../logic/forward_file';
import type { Fault } from '../../logic/forwards';
import { format, t } from '../../text';

export function faultText(fault: Fault): string {
  const texts = t().portforward;
  return format(texts.faults[fault.code], {
    port: fault.port ?? '',
    name: fault.other ? fault.other.service || texts.noName : '',
    number: fault.other ? fault.other.index + 1 : '',
    ports: fault.other?.ports ?? '',
  });
}

export function problemText(problem: ImportProblem): string {
  const text = t().portforward.problems[problem.code];
  if (!('rule' in problem)) return text;
  const why = problem.code === 'fault' ? faultText(problem.fault) : '';
  return format(text, { rule: problem.rule, field: problem.field, why });
}

/** TCP ports on which this very page answers. */
export function managementPorts(): number[] {
  return [Number(location.port) || (location.protocol === 'https:' ? 443 : 80)];
}
